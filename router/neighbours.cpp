#include "router/neighbours.h"

#include <array>
#include <fstream>
#include <string>

namespace router {

namespace {

constexpr char kIncomplete[] = "0x0"; // no flag: the kernel has asked and has no answer
constexpr char kBridgePart[] = "br";
constexpr char kBlanks[] = " \t\n\v\f\r";

enum Column { kIp, kHardwareType, kFlags, kMac, kMask, kDevice, kColumnCount };
using Columns = std::array<std::string_view, kColumnCount>;

// Columns that a line lacks stay empty.
Columns Split(std::string_view line) {
  Columns columns;
  for (std::string_view &column : columns) {
    const size_t begin = line.find_first_not_of(kBlanks);
    if (begin == std::string_view::npos) {
      break;
    }
    const size_t end = line.find_first_of(kBlanks, begin);
    column = line.substr(begin, end - begin);
    line.remove_prefix(begin + column.size());
  }
  return columns;
}

} // namespace

bool VisitNeighbours(const std::function<void(const Neighbour &)> &visit) {
  std::ifstream file(kNeighbourFile);
  if (!file) {
    return false;
  }
  // The title drops out with the other lines: its sixth word names no bridge.
  for (std::string line; std::getline(file, line);) {
    const Columns columns = Split(line);
    if (columns[kFlags] != kIncomplete && columns[kDevice].find(kBridgePart) != std::string_view::npos) {
      visit({columns[kIp], columns[kMac], columns[kDevice]});
    }
  }
  return true;
}

} // namespace router
