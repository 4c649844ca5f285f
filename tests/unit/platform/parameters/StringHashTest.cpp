// Hashes of texts, and what becomes of one as JSON.

#include "webapi/platform/StringHash.h"

#include <gtest/gtest.h>

#include <string>

#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

class StringHash : public testing::Test {
 protected:
  ~StringHash() override { QLIBCSzHashFree(hash); }

  std::string Json(Json::Value object = Json::Value()) {
    return WebAPIUtil::SzHashToJsonObj(hash, object) ? JsonHelper::toString(object) : "(false)";
  }

  QLIBSZHASH* hash = QLIBCSzHashAlloc(256);
};

TEST_F(StringHash, EachNameHasOneValue) {
  EXPECT_EQ(QLIBCSzHashGetValue(hash, "a"), nullptr);
  EXPECT_EQ(QLIBCSzHashSetValue(&hash, "a", "1"), 0);
  EXPECT_EQ(QLIBCSzHashSetValue(&hash, "a", "2"), 0);
  EXPECT_STREQ(QLIBCSzHashGetValue(hash, "a"), "2");
  QLIBCHashRemoveAll(hash);
  EXPECT_EQ(QLIBCSzHashGetValue(hash, "a"), nullptr);
}

TEST_F(StringHash, NamesComeInOrder) {
  const char* value = nullptr;
  EXPECT_EQ(QLIBCSzHashNext(hash, nullptr, &value), nullptr);
  for (const char* name : {"b", "a", "c"}) {
    QLIBCSzHashSetValue(&hash, name, name);
  }
  std::string names;
  for (const char* name = nullptr; (name = QLIBCSzHashNext(hash, name, &value)) != nullptr;) {
    names += std::string(name) + value;
  }
  EXPECT_EQ(names, "aabbcc");
  EXPECT_STREQ(QLIBCSzHashNext(hash, "a", nullptr), "b");
}

TEST_F(StringHash, NullIsMadeAndHoldsNothing) {
  QLIBSZHASH* made = nullptr;
  EXPECT_EQ(QLIBCSzHashNext(made, nullptr, nullptr), nullptr);
  EXPECT_EQ(QLIBCSzHashGetValue(made, "a"), nullptr);
  QLIBCHashRemoveAll(made);
  EXPECT_EQ(QLIBCSzHashSetValue(&made, "a", "1"), 0);
  EXPECT_STREQ(QLIBCSzHashGetValue(made, "a"), "1");
  QLIBCSzHashFree(made);
  QLIBCSzHashFree(nullptr);
}

TEST_F(StringHash, BecomesJsonAsAParameterLineDoes) {
  EXPECT_EQ(Json(), "{}");
  QLIBCSzHashSetValue(&hash, "n", "5");
  QLIBCSzHashSetValue(&hash, "l", "[1, \"x\"]");
  QLIBCSzHashSetValue(&hash, "t", "text");
  QLIBCSzHashSetValue(&hash, "p", "/tmp/file");
  QLIBCSzHashSetValue(&hash, "e", "");
  EXPECT_EQ(Json(), R"({"e":"","l":[1,"x"],"n":5,"p":"/tmp/file","t":"text"})");
}

TEST_F(StringHash, TakesThePlaceOfMembersOfTheSameName) {
  QLIBCSzHashSetValue(&hash, "n", "5");
  Json::Value object(Json::objectValue);
  object["n"] = "old";
  object["k"] = "kept";
  EXPECT_EQ(Json(object), R"({"k":"kept","n":5})");
}

TEST_F(StringHash, OnlyAnObjectTakesOne) {
  QLIBCSzHashSetValue(&hash, "n", "5");
  EXPECT_EQ(Json("text"), "(false)");
  EXPECT_EQ(Json(Json::Value(Json::arrayValue)), "(false)");
  Json::Value object;
  EXPECT_FALSE(WebAPIUtil::SzHashToJsonObj(nullptr, object));
}

TEST_F(StringHash, ValuesHaveALimitTogether) {
  std::string list = "[0";
  for (int i = 1; i < 24'998; ++i) {
    list += ",0";
  }
  QLIBCSzHashSetValue(&hash, "a", (list + "]").c_str());
  QLIBCSzHashSetValue(&hash, "b", (list + "]").c_str());
  QLIBCSzHashSetValue(&hash, "c", "text");
  EXPECT_NE(Json(), "(false)");
  QLIBCSzHashSetValue(&hash, "d", "[0]");
  EXPECT_EQ(Json(), "(false)");
}

}  // namespace
}  // namespace QELO
