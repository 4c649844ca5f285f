#include "webapi/APIDescription.h"

#include <gtest/gtest.h>

#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

using Names = std::vector<std::string>;

class Description : public testing::Test {
 protected:
  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  const Json::Value json = Parse(R"({
    "lib": "x.so", "minVersion": 1, "maxVersion": 10, "priority": -10,
    "methods": {"10": ["late"], "2": ["plain", {"first": {"allowDemo": true}, "second": {"never": 1}},
                                      {}, 7, "plain", {"odd": "text"}],
                "0": ["zero"], "11": ["beyond"], "01": ["unfound"], "3": "no list", "x": []}})");
  const APIDescription tested{json};
};

TEST_F(Description, FaultNamesTheKeyThatIsWrong) {
  const auto fault = [&](const char* key, const char* value) {
    Json::Value wrong = json;
    wrong[key] = Parse(value);
    return APIDescription(wrong).Fault();
  };
  EXPECT_EQ(tested.Fault(), "");
  EXPECT_EQ(APIDescription(Parse("[]")).Fault(), "it is no object");
  EXPECT_EQ(fault("lib", "5"), "\"lib\" is no string");
  EXPECT_EQ(fault("minVersion", "\"1\""), "\"minVersion\" is no integer");
  EXPECT_EQ(fault("maxVersion", "null"), "\"maxVersion\" is no integer");
  EXPECT_EQ(fault("methods", "[]"), "\"methods\" is no object");
  for (const char* priority : {"11", "-11", "1.5", "null", "\"5\""}) {
    EXPECT_EQ(fault("priority", priority), "\"priority\" is no integer from -10 to 10") << priority;
  }
}

TEST_F(Description, VersionsAreThoseThatCanBeCalledInTheirOrder) {
  EXPECT_EQ(tested.Versions(), (std::vector<int>{2, 10}));
  EXPECT_TRUE(tested.HasVersion(1));
  EXPECT_TRUE(tested.HasVersion(10));
  EXPECT_FALSE(tested.HasVersion(0));
  EXPECT_FALSE(tested.HasVersion(11));
}

TEST_F(Description, MethodsAreTextsAndMembersOfObjectsEachOnce) {
  EXPECT_EQ(tested.Methods(2), (Names{"plain", "first", "second", "odd"}));
  EXPECT_EQ(tested.Methods(3), Names());
  EXPECT_EQ(tested.Methods(4), Names());
  for (const std::string& method : tested.Methods(2)) {
    EXPECT_TRUE(tested.Lists(2, method)) << method;
  }
  EXPECT_FALSE(tested.Lists(2, "late"));
  EXPECT_FALSE(tested.Lists(3, "plain"));
  EXPECT_FALSE(tested.Lists(2, ""));
}

TEST_F(Description, FirstMemberOfAnObjectAloneHasAttributes) {
  ASSERT_NE(tested.Attributes(2, "first"), nullptr);
  EXPECT_EQ(*tested.Attributes(2, "first"), Parse(R"({"allowDemo": true})"));
  EXPECT_EQ(tested.Attributes(2, "second"), nullptr);
  EXPECT_EQ(tested.Attributes(2, "plain"), nullptr);
  EXPECT_EQ(tested.Attributes(9, "first"), nullptr);
  ASSERT_NE(tested.Attributes(2, "odd"), nullptr);
  EXPECT_EQ(*tested.Attributes(2, "odd"), Json::Value("text"));
}

TEST_F(Description, AttributesThatAreNoObjectSetNone) {
  EXPECT_TRUE(APIDescription::IsSet(Parse(R"({"a": true})"), "a"));
  EXPECT_FALSE(APIDescription::IsSet(Parse(R"({"a": false})"), "a"));
  EXPECT_FALSE(APIDescription::IsSet(Parse(R"({"a": "true"})"), "a"));
  for (const char* odd : {"null", "true", "\"a\"", "[\"a\"]"}) {
    EXPECT_FALSE(APIDescription::IsSet(Parse(odd), "a")) << odd;
  }
}

TEST_F(Description, AuthLevelOfAnotherTypeAsksForALogin) {
  const auto level = [](const std::string& text) {
    const Json::Value description = Parse(R"({"authLevel": )" + text + "}");
    return APIDescription(description).GetAuthLevel();
  };
  EXPECT_EQ(level("0"), APIDescription::AUTH_NONE);
  EXPECT_EQ(level("2"), APIDescription::AUTH_SKIP);
  for (const char* odd : {"1", "\"0\"", "false", "0.0", "null", "[]", "4294967296"}) {
    EXPECT_EQ(level(odd), APIDescription::AUTH_LOGIN) << odd;
  }
  EXPECT_EQ(tested.GetAuthLevel(), APIDescription::AUTH_LOGIN);
}

TEST_F(Description, MethodsOwnKeysComeBeforeTheApis) {
  const Json::Value description =
      Parse(R"({"allowUser": ["admin.local"], "runAs": "alice", "appPriv": "Files"})");
  const APIDescription api(description);
  const Json::Value none(Json::objectValue);
  EXPECT_EQ(api.GetAllowUser(none), description["allowUser"]);
  EXPECT_EQ(api.GetRunAs(none), "alice");
  EXPECT_EQ(api.GetAppPriv(), Json::Value("Files"));
  const Json::Value own = Parse(R"({"allowUser": null, "runAs": "bob"})");
  EXPECT_TRUE(api.GetAllowUser(own).isNull());
  EXPECT_EQ(api.GetRunAs(own), "bob");
  EXPECT_EQ(tested.GetRunAs(none), "system");
  EXPECT_TRUE(tested.GetAllowUser(none).isNull());
  EXPECT_TRUE(tested.GetAppPriv().isNull());
}

TEST_F(Description, AnyValueCanBeAsked) {
  for (const char* text : {"null", "5", "\"text\"", "[1]", R"({"methods": [1]})",
                           R"({"methods": {"1": [[], null, {"a": []}]}, "minVersion": {}})"}) {
    const Json::Value value = Parse(text);
    const APIDescription odd(value);
    EXPECT_NE(odd.Fault(), "") << text;
    EXPECT_TRUE(odd.Versions().empty()) << text;
    EXPECT_FALSE(odd.Lists(1, "x")) << text;
    EXPECT_EQ(odd.Attributes(1, "x"), nullptr) << text;
    EXPECT_EQ(odd.GetAuthLevel(), APIDescription::AUTH_LOGIN) << text;
    EXPECT_EQ(odd.GetRunAs(value), "system") << text;
  }
}

TEST_F(Description, CallsShareAProcess_WhereTheWordSaysSoAlone) {
  EXPECT_TRUE(APIDescription::SharesProcess(Parse(R"({"isolation": "worker"})")));
  for (const char* odd : {"{}", "null", "[]", R"("worker")", R"({"isolation": "process"})",
                          R"({"isolation": "Worker"})", R"({"isolation": "worker "})",
                          R"({"isolation": true})", R"({"isolation": ["worker"]})"}) {
    EXPECT_FALSE(APIDescription::SharesProcess(Parse(odd))) << odd;
  }
}

}  // namespace
}  // namespace QELO
