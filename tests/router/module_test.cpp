// The file itself: router.so is opened as a framework opens it, over the real libraries.
#include "platform/webapi.h"

#include <gtest/gtest.h>

#include <dlfcn.h>

namespace {

TEST(Module, OffersItsTableUnderThePlainName) {
  void *module = dlopen(ROUTER_MODULE, RTLD_NOW | RTLD_LOCAL);
  ASSERT_NE(module, nullptr) << dlerror();
  const auto getTable = reinterpret_cast<VORN::APIEntry *(*)()>(dlsym(module, "GetAPITable"));
  ASSERT_NE(getTable, nullptr);
  const VORN::APIEntry *table = getTable();
  EXPECT_EQ(table, dlsym(module, "gTable"));
  EXPECT_STREQ(table[0].api, "VORN.Core.Network.Router.ConnectionList");
  EXPECT_EQ(table[23].api, nullptr);
  // A handler is found under its linkage name, and is the one that the table refers to.
  EXPECT_EQ(reinterpret_cast<void *>(table[15].handler),
            dlsym(module, "_Z14GetTopology_V2PN4VORN10APIRequestEPNS_11APIResponseE"));
  EXPECT_EQ(dlclose(module), 0);
}

} // namespace
