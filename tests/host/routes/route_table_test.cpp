// The routing tables by name.
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/routes/scene.h"

using namespace hosttest; // NOLINT(google-build-using-namespace)
using vornnetwork::network::IP_TYPE_V4;
using vornnetwork::network::IP_TYPE_V6;
using vornnetwork::network::StaticRoute;

namespace {

constexpr char kBuiltIn[] = R"({"id":253,"name":"default"},{"id":254,"name":"main"},{"id":255,"name":"local"}])";

class RouteTableTest : public testing::Test {
protected:
  void SetUp() override { Shell("rm -rf /etc/iproute2/rt_tables /etc/iproute2/rt_tables.d"); }
};

std::string Tables() {
  Json::Value four;
  Json::Value six;
  EXPECT_EQ(StaticRoute().GetRouteTables(IP_TYPE_V4, four), 0);
  EXPECT_EQ(StaticRoute().GetRouteTables(IP_TYPE_V6, six), 0);
  EXPECT_EQ(four, six);
  return Text(four);
}

TEST_F(RouteTableTest, WithoutFilesThereAreTheKernelsOwn) {
  EXPECT_EQ(Tables(), "[" + std::string(kBuiltIn));
}

TEST_F(RouteTableTest, NamesComeFromTheFileAndFromTheFolderBesideIt) {
  WriteText("/etc/iproute2/rt_tables", "#\n# reserved values\n255\tlocal\n254\tmain\n0\tunspec\n#1\tinr.ruhep\n"
                                       "100 wan2 # second\n0x65 hex\n");
  Shell("mkdir /etc/iproute2/rt_tables.d");
  WriteText("/etc/iproute2/rt_tables.d/vpn.conf", "200 vpn\n");
  WriteText("/etc/iproute2/rt_tables.d/z.conf", "200 vpn-renamed\n");
  WriteText("/etc/iproute2/rt_tables.d/ignored.txt", "201 ignored\n");
  EXPECT_EQ(Tables(), R"([{"id":100,"name":"wan2"},{"id":101,"name":"hex"},{"id":200,"name":"vpn-renamed"},)" +
                          std::string(kBuiltIn));
  EXPECT_EQ(Shell("ip route add 10.3.0.0/16 dev lo table vpn-renamed && ip route show table 200"),
            "10.3.0.0/16 dev lo scope link \n"); // ip reads them so, too
}

TEST_F(RouteTableTest, LinesThatAreNoneArePassedOver) {
  WriteText("/etc/iproute2/rt_tables", "x y\n-1 minus\n4294967296 large\n12x z\n7\n\n 8 \t blank\n9 #none\n");
  EXPECT_EQ(Tables(), R"([{"id":8,"name":"blank"},)" + std::string(kBuiltIn));
}

} // namespace
