// check_description MODULE DESCRIPTION: fails when a row of the module is not described, or what is no row is. The
// build runs it, so that no row goes out undocumented.
#include "webapi/api_document.h"
#include "webapi/module.h"

#include <cstdio>
#include <cstdlib>

int main(int argc, char **argv) {
  if (argc != 3) {
    std::fputs("usage: check_description MODULE DESCRIPTION\n", stderr);
    return EXIT_FAILURE;
  }
  std::vector<VORN::APIEntry> rows;
  std::string fault;
  std::string description;
  if (!vornwebapi::LoadModule(argv[1], rows, fault)) {
    std::fprintf(stderr, "%s\n", fault.c_str());
    return EXIT_FAILURE;
  }
  if (!vornwebapi::ReadDescription(argv[2], description)) {
    std::fprintf(stderr, "cannot read %s\n", argv[2]);
    return EXIT_FAILURE;
  }
  std::vector<std::string> faults;
  vornwebapi::MakeApiDocument(rows, description, false, faults);
  for (const std::string &each : faults) {
    std::fprintf(stderr, "%s: %s\n", argv[2], each.c_str());
  }
  return faults.empty() ? EXIT_SUCCESS : EXIT_FAILURE;
}
