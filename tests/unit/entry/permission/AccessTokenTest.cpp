// The access token that stands in for a session.

#include <algorithm>

#include "tests/unit/entry/permission/Fixture.h"
#include "webapi/WebAPIError.h"

namespace QELO {
namespace {

TEST_F(Permission, AccessTokenServesWithoutASession) {
  token = "T";
  platform->tokenGrant = 0;
  platform->tokenUser = "bob";
  Describe(kOpenToAll);
  MakeRequest(*entry_, "");
  EXPECT_TRUE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
  EXPECT_EQ(platform->calls[platform->calls.size() - 2],
            "QeloAccessTokenGrant(T, QELO.Test.Good, echo)");
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "bob");
  EXPECT_EQ(entry_->Request()->GetAuthResult(), AUTHORIZED_YES);
}

TEST_F(Permission, AccessTokenServesWhenTheSessionIsRefused) {
  token = "T";
  platform->authorized = -1;
  platform->tokenGrant = 7;
  platform->tokenUser = "bob";
  EXPECT_TRUE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "bob");
}

TEST_F(Permission, AccessTokenLeavesNothingOfTheRefusedSessionButTheLanguage) {
  token = "T";
  platform->authorized = -7;
  platform->authorizedUser = "victim";
  platform->language = "ger";
  platform->options = {{"sessfile", "/sessions/S"}, {"istimeout", "1"}, {"timeout", "900"},
                       {"skipcheckip", "1"},        {"app", "Desk"},    {"webapi", "all"}};
  platform->tokenGrant = 0;
  platform->tokenUser = "bob";
  EXPECT_TRUE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Request()->GetSessionID(), "");
  EXPECT_EQ(entry_->Request()->GetUILanguage(), "ger");
  EXPECT_EQ(entry_->Request()->Serialize()["session"],
            Parse(R"({"username": "bob", "isAdmin": false, "sessFile": "", "isTimeout": false,
                      "timeout": 0, "isSkipCheckIP": false, "uiLang": "ger", "app": "",
                      "webapi": "", "isAuthorized": true, "tokenEnable": false, "appPriv": "",
                      "authResult": 1})"));
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "bob");
}

TEST_F(Permission, AccessTokenWithoutASessionLeavesLanguageAndCookiesAsTheyCame) {
  platform->language = "ger";
  platform->tokenGrant = 0;
  platform->tokenUser = "bob";
  Describe(kOpenToAll);
  Get("api=QELO.Test.Good&version=1&method=echo&tid=T");
  Set("HTTP_COOKIE", "lang=ger");
  TestEntry entry;
  Printed([&entry] { entry.Run(Json::Value()); });
  const APIRequest& request = *entry.Request();
  EXPECT_EQ(request.GetLoginUserName(), "bob");
  EXPECT_EQ(request.GetUILanguage(), "ger");
  EXPECT_EQ(request.GetCookie("lang"), "ger");
  EXPECT_FALSE(request.HasCookie("id"));
}

TEST_F(Permission, AccessTokenIsAskedForEachCallWithinTheRequest) {
  token = "T";
  platform->tokenGrant = 0;
  platform->tokenUser = "bob";
  Describe(kOpenToAll);
  MakeRequest(*entry_, "");
  ASSERT_TRUE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  APIRequest inner(*entry_->Request());
  APIResponse answer(&inner);
  EXPECT_TRUE(entry_->CheckPermission(&inner, &answer));
  platform->tokenGrant = -1;
  EXPECT_FALSE(entry_->CheckPermission(&inner, &answer));
  EXPECT_EQ(answer.GetError(), 119);
  EXPECT_EQ(inner.GetLoginUserName(), "");
}

TEST_F(Permission, AnotherSidParameterWaivesNoToken) {
  Describe(kOpenToAll);
  MakeRequest(*entry_, "S", R"({"_sid": "other"})");
  entry_->CheckPermission(entry_->Request(), entry_->Response());
  EXPECT_EQ(
      std::count(platform->calls.begin(), platform->calls.end(), "QeloCgiIsAuthorizedEx(0, 0, 1)"),
      1);
}

TEST_F(Permission, AccessTokenIsNotAskedWhenTheSessionIsGood) {
  token = "T";
  EXPECT_TRUE(Check(kOpenToAll));
  EXPECT_EQ(Calls("QeloAccessTokenGrant"), 0);
}

TEST_F(Permission, RefusedAccessTokenIsNotAuthenticated) {
  token = "T";
  platform->authorized = -1;
  platform->tokenUser = "bob";
  EXPECT_FALSE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Response()->GetError(), 119);
  EXPECT_EQ(entry_->Response()->GetServerError(), "unauth");
  EXPECT_EQ(entry_->Request()->GetAuthResult(), AUTHORIZED_UNAUTHENTICATED);
}

TEST_F(Permission, RefusedAccessTokenLeavesNoUserBehind) {
  token = "T";
  platform->authorized = -1;  // and names the user whose session it was
  platform->tokenUser = "bob";
  Check(kOpenToAll);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "");
  EXPECT_FALSE(entry_->Request()->IsAuthorized());
  EXPECT_FALSE(entry_->Request()->IsAdmin());
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "");
}

class PermissionTwice : public Permission {
 protected:
  /// A session that has timed out, and a token.
  void SetUp() override {
    Permission::SetUp();
    Set("HTTP_COOKIE", "id=S");
    token = "T";
    platform->tokenGrant = 0;
    platform->tokenUser = "bob";
    platform->options = {{"app", "Desk"}};
    Describe(kOpenToAll);
    MakeRequest(*entry_);
  }

  /// One allowance's check. @return user, session id, application and environment of the request
  std::string Ask(bool allowTimeout) {
    platform->authorized = allowTimeout ? 2 : -1;
    EXPECT_EQ(entry_->CheckPermission(allowTimeout), 0);
    const APIRequest& request = *entry_->Request();
    return request.GetLoginUserName() + " " + request.GetSessionID() + " " +
           request.GetApplication() + " " + Environment("QELO_WEBAPI_USERNAME") + " " +
           std::to_string(request.GetAuthResult());
  }

  static constexpr char kBySession[] = "ann S Desk ann 2";
  static constexpr char kByToken[] = "bob   bob 1";
};

TEST_F(PermissionTwice, SessionIsAskedAgainWhereATokenStoodInForIt) {
  EXPECT_EQ(Ask(false), kByToken);
  EXPECT_EQ(Ask(true), kBySession);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 2);
}

TEST_F(PermissionTwice, TokenStandsInWhereTheSessionWasGoodForTheOtherAllowance) {
  EXPECT_EQ(Ask(true), kBySession);
  EXPECT_EQ(Ask(false), kByToken);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 2);
}

TEST_F(PermissionTwice, TokenOfTheOneAllowanceIsNoAnswerForTheOther) {
  platform->authorized = -5;
  EXPECT_EQ(entry_->CheckPermission(true), 0);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "bob");
  platform->authorized = 1;
  EXPECT_EQ(entry_->CheckPermission(false), 0);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "ann");
  EXPECT_EQ(entry_->Request()->GetSessionID(), "S");
}

TEST_F(PermissionTwice, AllowancesFoundBeforeKeepTheirOwnCaller) {
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(Ask(true), kBySession);
    EXPECT_EQ(Ask(false), kByToken);
  }
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 2);
  EXPECT_EQ(Calls("QeloAccessTokenGrant"), 1);
}

TEST_F(PermissionTwice, RefusedAllowanceKeepsNothingOfTheOtherOnesCaller) {
  token.clear();
  entry_ = std::make_unique<TestEntry>();
  MakeRequest(*entry_);
  EXPECT_EQ(Ask(true), kBySession);
  platform->authorized = -1;
  EXPECT_EQ(entry_->CheckPermission(false), 106);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "");
  EXPECT_FALSE(entry_->Request()->IsAuthorized());
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "");
  EXPECT_EQ(Ask(true), kBySession);
}

TEST_F(PermissionTwice, InnerCallsHaveTheCallerOfTheirOwnAllowance) {
  Json::Value file = Parse(R"({"QELO.Test.Good": {"lib": "", "minVersion": 1, "maxVersion": 1,
      "methods": {"1": [{"echo": {"allowTimeout": true}}, {"whoami": {}}]}}})");
  file["QELO.Test.Good"]["allowUser"] = Parse(kOpenToAll)["allowUser"];
  std::ofstream("QELO.Test.Good.lib") << JsonHelper::toString(file);
  entry_ = std::make_unique<TestEntry>();
  MakeRequest(*entry_);
  const auto inner = [this](const char* method) {
    platform->authorized = std::string(method) == "echo" ? 2 : -1;
    APIRequest request(*entry_->Request());
    Json::Value params;
    params["postParam"]["method"] = method;
    request.InitParam(params, true);
    APIResponse answer(&request);
    entry_->CheckPermission(&request, &answer);
    return request.GetLoginUserName() + " " + request.GetSessionID() + " " +
           std::to_string(answer.GetError());
  };
  EXPECT_EQ(inner("whoami"), "bob  0");
  EXPECT_EQ(inner("echo"), "ann S 0");
  platform->tokenGrant = -1;  // of the token alone is it asked what it covers
  EXPECT_EQ(inner("echo"), "ann S 0");
  EXPECT_EQ(inner("whoami"), "  119");
}

}  // namespace
}  // namespace QELO
