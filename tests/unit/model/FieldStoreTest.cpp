#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "webapi/JsonHelper.h"
#include "webapi/model/APIBase.h"

using namespace QELO;

namespace {

Json::Value json(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
  return value;
}

/// A store with this content.
APIBase storeOf(const std::string& text) {
  APIBase base;
  Json::Value content = json(text);
  base.Deserialize(content);
  return base;
}

std::string content(APIBase& base) {
  return JsonHelper::toString(base.Serialize());
}

}  // namespace

TEST(FieldStore, IsAnEmptyObjectAtFirst) {
  APIBase base;
  EXPECT_EQ(content(base), "{}");
}

TEST(FieldStoreInitField, CreatesAnEmptySection) {
  APIBase base;
  EXPECT_TRUE(base.InitField("s"));
  EXPECT_EQ(content(base), R"({"s":{}})");
}

TEST(FieldStoreInitField, KeepsTheContentOfAnExistingSection) {
  APIBase base = storeOf(R"({"s":{"a":1}})");
  EXPECT_FALSE(base.InitField("s"));
  EXPECT_EQ(content(base), R"({"s":{"a":1}})");
}

TEST(FieldStoreInitField, RefusesAnEmptyName) {
  APIBase base;
  EXPECT_FALSE(base.InitField(""));
  EXPECT_EQ(content(base), "{}");
}

TEST(FieldStoreHasData, IsTrueForAnExistingKeyOfAnExistingSectionOnly) {
  const APIBase base = storeOf(R"({"s":{"a":null}})");
  EXPECT_TRUE(base.HasData("s", "a"));
  EXPECT_FALSE(base.HasData("s", "b"));
  EXPECT_FALSE(base.HasData("s", ""));
  EXPECT_FALSE(base.HasData("t", "a"));
}

TEST(FieldStoreGetData, GivesTheMember) {
  const APIBase base = storeOf(R"({"s":{"a":[1]}})");
  EXPECT_EQ(base.GetData("s", "a", "default"), json("[1]"));
}

TEST(FieldStoreGetData, GivesTheDefaultItselfWhenSectionOrKeyIsMissing) {
  const APIBase base = storeOf(R"({"s":{"a":1}})");
  const Json::Value def("default");
  EXPECT_EQ(&base.GetData("t", "a", def), &def);
  EXPECT_EQ(&base.GetData("s", "b", def), &def);
  EXPECT_EQ(&base.GetData("t", "", def), &def);
  EXPECT_EQ(&base.GetData("t", def), &def);
}

TEST(FieldStoreGetData, GivesTheWholeSectionForAnEmptyKey) {
  APIBase base = storeOf(R"({"s":{"a":1},"n":7})");
  EXPECT_EQ(&base.GetData("s", "", "default"), &base.Serialize()["s"]);
  EXPECT_EQ(&base.GetData("s", "default"), &base.Serialize()["s"]);
  EXPECT_EQ(base.GetData("n", "default"), Json::Value(7));
}

TEST(FieldStoreGetData, WholeSectionFormCallsTheOtherFormVirtually) {
  class Derived : public APIBase {
   public:
    using APIBase::GetData;
    const Json::Value& GetData(const std::string&, const std::string& key,
                               const Json::Value&) const override {
      key_ = key;
      return answer_;
    }
    mutable std::string key_ = "not asked";
    Json::Value answer_ = "answer";
  };
  const Derived derived;
  EXPECT_EQ(&derived.GetData("s", Json::Value()), &derived.answer_);
  EXPECT_EQ(derived.key_, "");
}

TEST(FieldStoreSetData, ReplacesTheMember) {
  APIBase base = storeOf(R"({"s":{"a":{"b":1}}})");
  EXPECT_TRUE(base.SetData("s", "a", json("[2]"), false));
  EXPECT_TRUE(base.SetData("s", "c", Json::nullValue, false));
  EXPECT_EQ(content(base), R"({"s":{"a":[2],"c":null}})");
}

TEST(FieldStoreSetData, RefusesAnEmptyKey) {
  APIBase base = storeOf(R"({"s":{}})");
  EXPECT_FALSE(base.SetData("s", "", "x", false));
  EXPECT_EQ(content(base), R"({"s":{}})");
}

TEST(FieldStoreSetData, RefusesAMissingSectionAndDoesNotCreateIt) {
  APIBase base;
  EXPECT_FALSE(base.SetData("s", "a", "x", false));
  EXPECT_FALSE(base.SetData("s", json(R"({"a":"x"})"), false));
  EXPECT_EQ(content(base), "{}");
}

TEST(FieldStoreSetData, RefusesWhatIsNoStringWhenStringsAreAskedFor) {
  APIBase base = storeOf(R"({"s":{"a":"old"}})");
  for (const char* value : {"1", "true", "null", "[]", "{}", "[\"x\"]"}) {
    EXPECT_FALSE(base.SetData("s", "a", json(value), true)) << value;
  }
  EXPECT_EQ(content(base), R"({"s":{"a":"old"}})");
  EXPECT_TRUE(base.SetData("s", "a", "new", true));
  EXPECT_EQ(content(base), R"({"s":{"a":"new"}})");
}

TEST(FieldStoreMerge, AddsAndReplacesMembersAndKeepsTheOthers) {
  APIBase base = storeOf(R"({"s":{"a":1,"b":2}})");
  EXPECT_TRUE(base.SetData("s", json(R"({"b":[3],"c":null})"), false));
  EXPECT_EQ(content(base), R"({"s":{"a":1,"b":[3],"c":null}})");
}

TEST(FieldStoreMerge, LeavesOutWhatIsNoStringWhenStringsAreAskedFor) {
  APIBase base = storeOf(R"({"s":{}})");
  EXPECT_TRUE(base.SetData("s", json(R"({"a":1,"b":"x"})"), true));
  EXPECT_EQ(content(base), R"({"s":{"b":"x"}})");
}

TEST(FieldStoreMerge, IsTrueAlsoWhenEveryMemberWasLeftOut) {
  APIBase base = storeOf(R"({"s":{}})");
  EXPECT_TRUE(base.SetData("s", json(R"({"a":1})"), true));
  EXPECT_EQ(content(base), R"({"s":{}})");
}

TEST(FieldStoreMerge, RefusesWhatIsEmptyOrNoObject) {
  APIBase base = storeOf(R"({"s":{"a":1}})");
  for (const char* members : {"{}", "[]", "null", "[1]", "\"x\"", "1", "true"}) {
    EXPECT_FALSE(base.SetData("s", json(members), false)) << members;
  }
  EXPECT_EQ(content(base), R"({"s":{"a":1}})");
}

TEST(FieldStoreMerge, KeepsNamesThatHoldANul) {
  APIBase base = storeOf(R"({"s":{}})");
  const std::string name("a\0b", 3);
  Json::Value members;
  members[name] = "x";
  EXPECT_TRUE(base.SetData("s", members, true));
  EXPECT_TRUE(base.HasData("s", name));
  EXPECT_FALSE(base.HasData("s", "a"));
}

TEST(FieldStoreClearData, RemovesAMember) {
  APIBase base = storeOf(R"({"s":{"a":1,"b":2}})");
  EXPECT_TRUE(base.ClearData("s", "a"));
  EXPECT_EQ(content(base), R"({"s":{"b":2}})");
}

TEST(FieldStoreClearData, RefusesAMissingKeyAMissingSectionAndAnEmptyName) {
  APIBase base = storeOf(R"({"":{"a":1},"s":{"a":1}})");
  EXPECT_FALSE(base.ClearData("s", "b"));
  EXPECT_FALSE(base.ClearData("t", "a"));
  EXPECT_FALSE(base.ClearData("t", ""));
  EXPECT_FALSE(base.ClearData("", "a"));
  EXPECT_FALSE(base.ClearData("", ""));
  EXPECT_EQ(content(base), R"({"":{"a":1},"s":{"a":1}})");
}

TEST(FieldStoreClearData, EmptiesAnObjectOrAListAndKeepsTheSection) {
  APIBase base = storeOf(R"({"s":{"a":1},"setCookie":["x"]})");
  EXPECT_TRUE(base.ClearData("s", ""));
  EXPECT_TRUE(base.ClearData("setCookie", ""));
  EXPECT_EQ(content(base), R"({"s":{},"setCookie":[]})");
}

TEST(FieldStore, SerializeGivesTheStoreItself) {
  APIBase base;
  base.Serialize()["s"]["a"] = 1;
  EXPECT_TRUE(base.HasData("s", "a"));
}

TEST(FieldStore, DeserializeGivesThePreviousStateBack) {
  APIBase base = storeOf(R"({"old":{}})");
  Json::Value record = json(R"({"new":{}})");
  base.Deserialize(record);
  EXPECT_EQ(content(base), R"({"new":{}})");
  EXPECT_EQ(JsonHelper::toString(record), R"({"old":{}})");
}

TEST(FieldStore, CopiesAreSeparate) {
  APIBase base = storeOf(R"({"s":{}})");
  APIBase copy = base;
  copy.SetData("s", "a", 1, false);
  EXPECT_EQ(content(base), R"({"s":{}})");
  EXPECT_EQ(content(copy), R"({"s":{"a":1}})");
}

TEST(FieldStore, RefusesKeysInSectionsThatAreNoObjectsWithoutThrowing) {
  const std::string text = R"({"a":["x"],"b":true,"i":1,"t":"text"})";
  APIBase base = storeOf(text);
  const Json::Value def("default");
  for (const char* section : {"a", "b", "i", "t"}) {
    EXPECT_FALSE(base.HasData(section, "k"));
    EXPECT_EQ(&base.GetData(section, "k", def), &def);
    EXPECT_FALSE(base.SetData(section, "k", "v", false));
    EXPECT_FALSE(base.SetData(section, json(R"({"k":"v"})"), false));
    EXPECT_FALSE(base.ClearData(section, "k"));
    EXPECT_FALSE(base.InitField(section));
  }
  for (const char* section : {"b", "i", "t"}) {
    EXPECT_FALSE(base.ClearData(section, ""));
  }
  EXPECT_EQ(content(base), text);
}

TEST(FieldStore, RefusesEverythingInAStoreThatIsNoObjectWithoutThrowing) {
  const Json::Value def("default");
  for (const char* text : {"[1]", "\"text\"", "1", "true"}) {
    APIBase base = storeOf(text);
    EXPECT_FALSE(base.HasData("s", "k"));
    EXPECT_EQ(&base.GetData("s", "k", def), &def);
    EXPECT_EQ(&base.GetData("s", def), &def);
    EXPECT_FALSE(base.SetData("s", "k", "v", false));
    EXPECT_FALSE(base.SetData("s", json(R"({"k":"v"})"), false));
    EXPECT_FALSE(base.ClearData("s", "k"));
    EXPECT_FALSE(base.ClearData("s", ""));
    EXPECT_FALSE(base.InitField("s"));
    EXPECT_EQ(content(base), text);
  }
}

TEST(FieldStore, TakesKeysInANullSectionAsInAnEmptyOne) {
  APIBase base = storeOf(R"({"s":null})");
  EXPECT_TRUE(base.SetData("s", "a", 1, false));
  EXPECT_EQ(content(base), R"({"s":{"a":1}})");
}

TEST(FieldStoreMerge, KeepsTheOldValueOfANameThatIsLeftOut) {
  APIBase base = storeOf(R"({"s":{"a":"old","b":"old"}})");
  EXPECT_TRUE(base.SetData("s", json(R"({"a":1,"b":"new","c":[]})"), true));
  EXPECT_EQ(content(base), R"({"s":{"a":"old","b":"new"}})");
}

TEST(FieldStoreClearData, EmptiesANullSection) {
  APIBase base = storeOf(R"({"s":null})");
  EXPECT_TRUE(base.ClearData("s", ""));
  EXPECT_EQ(content(base), R"({"s":null})");
}
