// What stands behind the contract's hash handle.
#ifndef HOST_UTILITY_SZ_HASH_H
#define HOST_UTILITY_SZ_HASH_H

#include "platform/utility.h"

#include <list>
#include <string>
#include <string_view>
#include <unordered_map>

/// Pairs in the order in which their keys were first set. A list, because the texts must stay where they are.
struct QARDCSzHash {
  struct Pair {
    std::string key;
    std::string value;
  };

  explicit QARDCSzHash(size_t room);
  void Set(std::string key, std::string value);
  /// @return null when absent
  const std::string *Find(std::string_view key) const;
  /// @return the value that it had, valid until the next Remove; null when absent
  std::string *Remove(std::string_view key);
  const std::list<Pair> &Pairs() const { return pairs_; }

private:
  std::list<Pair> pairs_;
  std::unordered_map<std::string_view, std::list<Pair>::iterator> byKey_; // views of the keys in pairs_
  std::string removed_;
};

#endif
