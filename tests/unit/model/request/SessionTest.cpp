#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/request/Fixture.h"

using namespace QELO;

namespace {

APIRequest requestWithSession(const std::string& session) {
  Json::Value init;
  init["session"] = json(session);
  return APIRequest(init);
}

APIRequest requestAllowing(const std::string& classes) {
  Json::Value init;
  init["reqLib"]["allowUser"] = json(classes);
  return APIRequest(init);
}

constexpr unsigned int kNoUser = 0xFFFFFFFF;

}  // namespace

TEST(RequestSession, HasCautiousDefaultsWhenNoneWasLaid) {
  const APIRequest request;
  EXPECT_EQ(request.GetUILanguage(), "enu");
  EXPECT_TRUE(request.IsTimeout());
  EXPECT_TRUE(request.IsSkipCheckIP());
  EXPECT_FALSE(request.IsAdmin());
  EXPECT_FALSE(request.IsAuthorized());
  EXPECT_FALSE(request.IsTokenEnable());
  EXPECT_EQ(request.GetTimeoutDuration(), 0);
  EXPECT_EQ(request.GetSessionFilePath(), "");
  EXPECT_EQ(request.GetApplication(), "");
  EXPECT_EQ(request.GetWebAPIPriv(), "");
  EXPECT_EQ(request.GetLoginUserName(), "");
}

TEST(RequestSession, AnswersWhatWasLaid) {
  const APIRequest request(fullRequest());
  EXPECT_EQ(request.GetUILanguage(), "ger");
  EXPECT_FALSE(request.IsTimeout());
  EXPECT_FALSE(request.IsSkipCheckIP());
  EXPECT_TRUE(request.IsAdmin());
  EXPECT_TRUE(request.IsAuthorized());
  EXPECT_TRUE(request.IsTokenEnable());
  EXPECT_EQ(request.GetTimeoutDuration(), 60);
  EXPECT_EQ(request.GetSessionFilePath(), "/f");
  EXPECT_EQ(request.GetApplication(), "app");
  EXPECT_EQ(request.GetWebAPIPriv(), "priv");
  EXPECT_EQ(request.GetLoginUserName(), "alice");
}

TEST(RequestSession, GrantsNothingByValuesOfTheWrongType) {
  for (const char* wrong : {"\"true\"", "[true]", "{\"a\":true}", "null"}) {
    Json::Value session;
    for (const char* key : {"isAdmin", "isAuthorized", "tokenEnable", "isTimeout", "isSkipCheckIP",
                            "timeout", "authResult"}) {
      session[key] = json(wrong);
    }
    APIRequest request;
    request.InitSession(session);
    EXPECT_FALSE(request.IsAdmin()) << wrong;
    EXPECT_FALSE(request.IsAuthorized()) << wrong;
    EXPECT_FALSE(request.IsTokenEnable()) << wrong;
    EXPECT_TRUE(request.IsTimeout()) << wrong;
    EXPECT_FALSE(request.IsSkipCheckIP()) << wrong;
    EXPECT_EQ(request.GetTimeoutDuration(), 0) << wrong;
    EXPECT_EQ(request.GetAuthResult(), AUTHORIZED_UNKNOWN) << wrong;
  }
}

TEST(RequestAuthResult, IsUnknownOnAFreshRequest) {
  EXPECT_EQ(APIRequest().GetAuthResult(), -4);
}

TEST(RequestAuthResult, IsWhatWasSetAsAnInteger) {
  APIRequest request;
  EXPECT_TRUE(request.SetAuthResult(AUTHORIZED_TIMED_OUT));
  EXPECT_EQ(request.GetAuthResult(), AUTHORIZED_TIMED_OUT);
  EXPECT_EQ(request.Serialize()["session"]["authResult"].type(), Json::intValue);
}

TEST(RequestLoginUID, IsNoneWithoutAUserNameAndIsNotKept) {
  FakePlatform::Reset();
  for (const char* session : {"{}", R"({"username":""})"}) {
    APIRequest request = requestWithSession(session);
    EXPECT_EQ(request.GetLoginUID(), kNoUser);
    EXPECT_FALSE(request.Serialize()["session"].isMember("uid"));
  }
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST(RequestLoginUID, AsksThePlatformWithSessionIdAndNameOnce) {
  FakePlatform::Reset().uid = 1026;
  APIRequest request = requestWithSession(R"({"username":"alice"})");
  request.SetCookie("id", "abc");
  EXPECT_EQ(request.GetLoginUID(), 1026u);
  EXPECT_EQ(request.Serialize()["session"]["uid"], Json::Value(1026u));
  FakePlatform::Get().uid = 1;
  request.Serialize()["session"]["username"] = "bob";
  EXPECT_EQ(request.GetLoginUID(), 1026u);
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>{"QeloCgiUIDGet(abc, alice)"});
}

TEST(RequestLoginUID, KeepsAFailedLookUpToo) {
  FakePlatform::Reset().uid = kNoUser;
  const APIRequest request = requestWithSession(R"({"username":"nobody"})");
  EXPECT_EQ(request.GetLoginUID(), kNoUser);
  FakePlatform::Get().uid = 1026;
  EXPECT_EQ(request.GetLoginUID(), kNoUser);
  EXPECT_EQ(FakePlatform::Get().calls.size(), 1u);
}

TEST(RequestLoginUID, IsNoneWhenWhatIsKeptIsNoUserId) {
  for (const char* uid : {"-1", "4294967295", "4294967296", "\"x\"", "[]", "{}", "null", "1e30"}) {
    const APIRequest request =
        requestWithSession(std::string(R"({"username":"alice","uid":)") + uid + "}");
    EXPECT_EQ(request.GetLoginUID(), kNoUser) << uid;
  }
}

TEST(RequestAllowUser, SetsABitForEveryKnownClass) {
  EXPECT_EQ(requestAllowing(R"(["admin.local"])").GetAllowUser(), 0x01);
  EXPECT_EQ(requestAllowing(R"(["admin.domain"])").GetAllowUser(), 0x02);
  EXPECT_EQ(requestAllowing(R"(["admin.ldap"])").GetAllowUser(), 0x04);
  EXPECT_EQ(requestAllowing(R"(["normal.local"])").GetAllowUser(), 0x08);
  EXPECT_EQ(requestAllowing(R"(["normal.domain"])").GetAllowUser(), 0x10);
  EXPECT_EQ(requestAllowing(R"(["normal.ldap"])").GetAllowUser(), 0x20);
}

TEST(RequestAllowUser, IgnoresUnknownNamesAndWhatIsNoString) {
  EXPECT_EQ(requestAllowing(R"(["admin.local","normal.ldap",5,"other"])").GetAllowUser(), 0x21);
  EXPECT_EQ(requestAllowing(R"(["Admin.local","admin.local ",["admin.local"]])").GetAllowUser(), 0);
}

TEST(RequestAllowUser, IsNothingAndNotKeptWithoutAList) {
  for (const char* list : {"[]", "{}", "\"admin.local\"", "null", "1"}) {
    APIRequest request = requestAllowing(list);
    EXPECT_EQ(request.GetAllowUser(), 0) << list;
    EXPECT_FALSE(request.Serialize()["session"].isMember("allowUser")) << list;
  }
  EXPECT_EQ(APIRequest().GetAllowUser(), 0);
}

TEST(RequestAllowUser, IsKeptOnceItIsNotZero) {
  APIRequest request = requestAllowing(R"(["admin.local"])");
  EXPECT_EQ(request.GetAllowUser(), 0x01);
  EXPECT_EQ(request.Serialize()["session"]["allowUser"], Json::Value(1));
  request.InitAPIInfo(json(R"({"allowUser":["normal.local"]})"));
  EXPECT_EQ(request.GetAllowUser(), 0x01);
}

TEST(RequestAllowUser, IsComputedAgainWhileItIsZero) {
  APIRequest request = requestAllowing(R"(["other"])");
  EXPECT_EQ(request.GetAllowUser(), 0);
  EXPECT_EQ(request.Serialize()["session"]["allowUser"], Json::Value(0));
  EXPECT_EQ(request.GetAllowUser(), 0);
  request.InitAPIInfo(json(R"({"allowUser":["normal.local"]})"));
  EXPECT_EQ(request.GetAllowUser(), 0x08);
}

TEST(RequestHasAppPriv, ComparesOneTextAndSearchesNoList) {
  const APIRequest request = requestWithSession(R"({"appPriv":"x"})");
  EXPECT_TRUE(request.HasAppPriv("x"));
  EXPECT_FALSE(request.HasAppPriv("y"));
  EXPECT_FALSE(requestWithSession(R"({"appPriv":["x"]})").HasAppPriv("x"));
  EXPECT_FALSE(requestWithSession(R"({"appPriv":5})").HasAppPriv("5"));
  EXPECT_FALSE(APIRequest().HasAppPriv("x"));
}

TEST(RequestLoginUID, KeptAsZeroIsRoot) {
  FakePlatform::Reset();
  EXPECT_EQ(requestWithSession(R"({"username":"root","uid":0})").GetLoginUID(), 0u);
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST(RequestLoginUID, AsksWithAnEmptySessionIdWithoutACookie) {
  FakePlatform::Reset();
  EXPECT_EQ(requestWithSession(R"({"username":"alice"})").GetLoginUID(), 1000u);
  EXPECT_EQ(FakePlatform::Get().calls, std::vector<std::string>{"QeloCgiUIDGet(, alice)"});
}

TEST(RequestHasAppPriv, OfNoNameIsTrueWhenNoneWasLaid) {
  EXPECT_TRUE(APIRequest().HasAppPriv(""));
}
