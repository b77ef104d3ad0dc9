// The kernel's nftables, through libnftables: the same language and the same transactions as nft(8), in this process.
#ifndef HOST_NFTABLES_NFTABLES_H
#define HOST_NFTABLES_NFTABLES_H

#include <json/value.h>

#include <memory>
#include <set>
#include <string>

struct nft_ctx;

namespace vornhost {

/// An object belongs to one thread.
class Nftables {
public:
  /// Throws std::bad_alloc.
  Nftables();

  /// Runs commands as one transaction: all of them, or none.
  /// @return false with the cause in the system log
  bool Run(const std::string &commands);

  /// @param[in]  what   "table inet name", "set inet table name" and the like
  /// @param[out] items  what the kernel has of it, as libnftables-json(5) says; an empty array when there is no such
  /// thing
  /// @return false when the kernel's answer cannot be read
  bool List(const std::string &what, Json::Value &items);

  /// @param[out] comments  those of the rules of one table; none when there is no such table
  /// @return false when the kernel's answer cannot be read
  bool ReadComments(const std::string &table, std::set<std::string> &comments);

private:
  struct Deleter {
    void operator()(nft_ctx *context) const;
  };
  std::unique_ptr<nft_ctx, Deleter> context_;
};

} // namespace vornhost

#endif
