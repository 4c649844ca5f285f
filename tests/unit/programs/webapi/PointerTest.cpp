#include "programs/webapi/text/Pointer.h"

#include <gtest/gtest.h>

#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

TEST(Pointer, LeadsToPartsOfObjectsAndLists) {
  Json::Value root;
  ASSERT_TRUE(JsonHelper::fromString(R"({"a": [5, {"x/y": 6, "~": 7}], "": 8})", root));
  EXPECT_EQ(&ValueAt(root, ""), &root);
  EXPECT_EQ(ValueAt(root, "/a/0"), 5);
  EXPECT_EQ(ValueAt(root, "/a/1/x~1y"), 6);
  EXPECT_EQ(ValueAt(root, "/a/1/~0"), 7);
}

TEST(Pointer, ThatLeadsNowhere_EndsOnItsWay) {
  Json::Value root;
  ASSERT_TRUE(JsonHelper::fromString(R"({"a": [5]})", root));
  EXPECT_EQ(&ValueAt(root, "/b/c"), &root);
  EXPECT_EQ(&ValueAt(root, "/a/7/x"), &root["a"]);
  EXPECT_EQ(&ValueAt(root, "/a/-1"), &root["a"]);
  EXPECT_EQ(ValueAt(root, "/a/0/x"), 5);
}

}  // namespace
}  // namespace QELO::AuthorProgram
