// SQLite, with exceptions and owners.
#ifndef HOST_DEVICES_DATABASE_H
#define HOST_DEVICES_DATABASE_H

#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>

struct sqlite3;
struct sqlite3_stmt;

namespace vornhost {

class DatabaseError : public std::runtime_error {
public:
  using std::runtime_error::runtime_error;
};

/// The file is no database, or its pages do not fit together: reading it again will not help. A disk that fails, a
/// lock, a lack of memory or of room are none of that.
class DamagedDatabase : public DatabaseError {
public:
  using DatabaseError::DatabaseError;
};

class Database;

/// A prepared statement. Parameters count from 1, columns from 0.
class Statement {
public:
  Statement(Database &database, const char *sql);

  Statement &Bind(int parameter, const std::string &text);
  Statement &Bind(int parameter, int64_t number);
  /// @return whether there is a row
  bool Step();
  /// Runs a statement that gives no rows, and makes it ready to be run again.
  void Run();
  std::string Text(int column) const;
  int64_t Number(int column) const;

private:
  struct Deleter {
    void operator()(sqlite3_stmt *statement) const;
  };
  sqlite3 *connection_;
  std::unique_ptr<sqlite3_stmt, Deleter> raw_;
};

/// One connection; it belongs to one thread at a time. Operations throw DatabaseError.
class Database {
public:
  /// @param[in] path  an existing file
  explicit Database(const std::string &path);

  void Execute(const char *sql);
  /// Reads all of it. Throws DamagedDatabase when the pages do not fit together.
  void CheckForm();
  /// A number that another connection's commit changes, and this one's own does not.
  int64_t DataVersion();
  int Changes() const;

private:
  friend class Statement;
  struct Deleter {
    void operator()(sqlite3 *connection) const;
  };
  std::unique_ptr<sqlite3, Deleter> raw_;
  std::unique_ptr<Statement> version_;
};

/// Undoes what was done since, unless Commit was called.
class Transaction {
public:
  explicit Transaction(Database &database);
  ~Transaction();
  Transaction(const Transaction &) = delete;
  Transaction &operator=(const Transaction &) = delete;
  void Commit();

private:
  Database &database_;
  bool open_ = true;
};

} // namespace vornhost

#endif
