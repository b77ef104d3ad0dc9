// main() of the tests that write absolute paths: they run under private_view or not at all.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>

int main(int argc, char **argv) {
  if (std::getenv("VORN_PRIVATE_VIEW") == nullptr) {
    std::fputs("This test writes to /etc and /tmp. Run it as: private_view -- <this program>\n", stderr);
    return 2;
  }
  testing::InitGoogleTest(&argc, argv);
  return RUN_ALL_TESTS();
}
