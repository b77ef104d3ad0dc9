// What stands behind the contract's list handle.
#ifndef HOST_UTILITY_SZ_LIST_H
#define HOST_UTILITY_SZ_LIST_H

#include "platform/utility.h"

#include <string>
#include <string_view>
#include <vector>

struct QARDCSzList {
  explicit QARDCSzList(size_t room);
  void Append(std::string_view text) { texts_.emplace_back(text); }
  const std::vector<std::string> &Texts() const { return texts_; }

private:
  std::vector<std::string> texts_;
};

#endif
