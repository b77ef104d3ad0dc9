// The kernel's nftables, through libnftables: the same language and the same transactions as nft(8), in this process.
#ifndef HOST_PORTFORWARD_NFTABLES_H
#define HOST_PORTFORWARD_NFTABLES_H

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
