#include "programs/entry/RestPath.h"

#include <gtest/gtest.h>

namespace QELO {
namespace {

TEST(RestPathTest, Path_NamesTheCall) {
  RestPath call;
  ASSERT_TRUE(RestPath::Read("/QELO.Host.Info/v12/get", call));
  EXPECT_EQ(call.api, "QELO.Host.Info");
  EXPECT_EQ(call.version, 12);
  EXPECT_EQ(call.method, "get");
}

TEST(RestPathTest, OtherPaths_NameNone) {
  for (const char* path :
       {"", "/", "A/v1/m", "/A", "/A/v1", "/A/v1/", "/A/1/m", "/A/v0/m", "/A/v01/m", "/A/v-1/m",
        "/A/v+1/m", "/A/v1x/m", "/A/v99999999999/m", "/A/v1/m/", "/A/v1/m/n", "//v1/m"}) {
    RestPath call;
    EXPECT_FALSE(RestPath::Read(path, call)) << path;
    EXPECT_EQ(call.api, "") << path;
  }
}

TEST(RestPathTest, Address_IsKnownByTheScriptsName) {
  EXPECT_TRUE(RestPath::IsAddress("/webapi/rest", "/A/v1/m"));
  EXPECT_TRUE(RestPath::IsAddress("/nas/webapi/rest", ""));
  EXPECT_TRUE(RestPath::IsAddress("/webapi/rest/a b", "/a%20b/v1/m")) << "as with escapes";
  EXPECT_FALSE(RestPath::IsAddress("/webapi/entry.cgi", ""));
  EXPECT_FALSE(RestPath::IsAddress("/webapi/entry.cgi", "/rest/x"));
  EXPECT_FALSE(RestPath::IsAddress("/rest/webapi/entry.cgi", ""));
  EXPECT_FALSE(RestPath::IsAddress("/webapi/restful", "/A/v1/m"));
  EXPECT_FALSE(RestPath::IsAddress("/webapi/unrest", "/A/v1/m"));
  EXPECT_FALSE(RestPath::IsAddress("rest", ""));
  EXPECT_FALSE(RestPath::IsAddress("", ""));
}

}  // namespace
}  // namespace QELO
