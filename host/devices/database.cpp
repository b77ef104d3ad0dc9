#include "host/devices/database.h"

#include "host/utility/log.h"

#include <sqlite3.h>

namespace vornhost {

namespace {

// How long a writer waits for its turn, in milliseconds. Nobody holds the store for longer than one small transaction.
constexpr int kBusyLimit = 5000;

[[noreturn]] void Fail(sqlite3 *connection, const char *what) {
  if (connection == nullptr) {
    throw DatabaseError(std::string(what) + ": no memory");
  }
  const std::string text = std::string(what) + ": " + sqlite3_errmsg(connection);
  const int kind = sqlite3_errcode(connection) & 0xff; // without the extension that says where
  if (kind == SQLITE_CORRUPT || kind == SQLITE_NOTADB) {
    throw DamagedDatabase(text);
  }
  throw DatabaseError(text);
}

void Check(sqlite3 *connection, int result, const char *what) {
  if (result != SQLITE_OK) {
    Fail(connection, what);
  }
}

} // namespace

void Statement::Deleter::operator()(sqlite3_stmt *statement) const {
  sqlite3_finalize(statement);
}

Statement::Statement(Database &database, const char *sql) : connection_(database.raw_.get()) {
  sqlite3_stmt *raw = nullptr;
  const int result = sqlite3_prepare_v2(connection_, sql, -1, &raw, nullptr);
  if (result == SQLITE_ERROR) { // the text is right: the tables are others
    throw DamagedDatabase(std::string("device store: ") + sqlite3_errmsg(connection_));
  }
  Check(connection_, result, "device store");
  raw_.reset(raw);
}

Statement &Statement::Bind(int parameter, const std::string &text) {
  Check(connection_,
        sqlite3_bind_text64(raw_.get(), parameter, text.data(), text.size(), SQLITE_TRANSIENT, SQLITE_UTF8), // NOLINT
        "device store");
  return *this;
}

Statement &Statement::Bind(int parameter, int64_t number) {
  Check(connection_, sqlite3_bind_int64(raw_.get(), parameter, number), "device store");
  return *this;
}

bool Statement::Step() {
  const int result = sqlite3_step(raw_.get());
  if (result != SQLITE_ROW && result != SQLITE_DONE) {
    Fail(connection_, "device store");
  }
  return result == SQLITE_ROW;
}

void Statement::Run() {
  Step();
  Check(connection_, sqlite3_reset(raw_.get()), "device store");
}

std::string Statement::Text(int column) const {
  const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(raw_.get(), column));
  return text == nullptr ? std::string()
                         : std::string(text, static_cast<size_t>(sqlite3_column_bytes(raw_.get(), column)));
}

int64_t Statement::Number(int column) const {
  return sqlite3_column_int64(raw_.get(), column);
}

void Database::Deleter::operator()(sqlite3 *connection) const {
  sqlite3_close_v2(connection); // waits for statements that are still there
}

Database::Database(const std::string &path) {
  sqlite3 *raw = nullptr;
  const int result = sqlite3_open_v2(path.c_str(), &raw, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
  raw_.reset(raw);
  Check(raw, result, path.c_str());
  Check(raw, sqlite3_busy_timeout(raw, kBusyLimit), "device store");
}

void Database::Execute(const char *sql) {
  Check(raw_.get(), sqlite3_exec(raw_.get(), sql, nullptr, nullptr, nullptr), "device store");
}

void Database::CheckForm() {
  Statement check(*this, "PRAGMA quick_check(1)");
  const std::string answer = check.Step() ? check.Text(0) : "";
  if (answer == "ok") {
    return;
  }
  // What this check finds it tells as text, a disk that fails too.
  for (const char *unread : {"unable to get the page", "failed to get page"}) {
    if (answer.find(unread) != std::string::npos) {
      throw DatabaseError("device store: " + answer);
    }
  }
  throw DamagedDatabase("device store: " + answer);
}

int64_t Database::DataVersion() {
  if (!version_) {
    version_ = std::make_unique<Statement>(*this, "PRAGMA data_version");
  }
  const int64_t version = version_->Step() ? version_->Number(0) : 0;
  version_->Run();
  return version;
}

int Database::Changes() const {
  return sqlite3_changes(raw_.get());
}

Transaction::Transaction(Database &database) : database_(database) {
  database_.Execute("BEGIN IMMEDIATE");
}

Transaction::~Transaction() {
  if (open_) {
    try {
      database_.Execute("ROLLBACK");
    } catch (const DatabaseError &error) { // it is rolled back with the connection
      LogError("%s", LogText(error.what()).c_str());
    }
  }
}

void Transaction::Commit() {
  database_.Execute("COMMIT");
  open_ = false;
}

} // namespace vornhost
