// QELO.Host.Info as its callers see it.

#include <gtest/gtest.h>
#include <unistd.h>
#include <webapi/testing/TestHost.h>

#include <climits>

namespace {

class HostInfo : public testing::Test {
 protected:
  HostInfo() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Host.Info.lib.in"));
    host.AddUser("alice", 1001);
    host.AddUser("boss", 1002, true);
  }
  QELO::TestAnswer Get() { return host.Call("QELO.Host.Info", 1, "get"); }

  QELO::TestHost host;
};

TEST_F(HostInfo, IsForAdministrators) {
  EXPECT_EQ(Get().Code(), 105);
  host.LogIn("alice");
  EXPECT_EQ(Get().Code(), 105);
  host.LogIn("boss");
  EXPECT_TRUE(Get().IsSuccess());
}

TEST_F(HostInfo, TellsTheHostsState) {
  char name[HOST_NAME_MAX + 1] = "";
  ASSERT_EQ(gethostname(name, sizeof name), 0);
  host.LogIn("boss");
  const Json::Value data = Get().Data();
  EXPECT_EQ(data["hostName"], name);
  EXPECT_GT(data["uptime"].asInt64(), 0);
  EXPECT_EQ(data["load"].size(), 3U);
  EXPECT_LE(data["memory"]["free"].asUInt64(), data["memory"]["total"].asUInt64());
  EXPECT_TRUE(data["volumes"].isArray());
}

}  // namespace
