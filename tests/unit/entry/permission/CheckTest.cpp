// Who calls, and whether that user may run the method.

#include "tests/unit/entry/FailingSetenv.h"
#include "tests/unit/entry/permission/Fixture.h"
#include "webapi/WebAPIError.h"

namespace QELO {
namespace {

TEST_F(Permission, ApiWithoutAuthLevelNeedsItAndIsNotSkipped) {
  EXPECT_TRUE(entry_->NeedPermission(entry_->Request()));
  EXPECT_FALSE(entry_->SkipPermission(entry_->Request()));
}

TEST_F(Permission, AuthLevelDecidesOnNeedAndSkip) {
  const auto ask = [this](const char* description) {
    entry_->Request()->InitAPIInfo(Parse(description));
    return std::pair(entry_->NeedPermission(entry_->Request()),
                     entry_->SkipPermission(entry_->Request()));
  };
  EXPECT_EQ(ask(R"({"authLevel": 0})"), std::pair(false, false));
  EXPECT_EQ(ask(R"({"authLevel": 1})"), std::pair(true, false));
  EXPECT_EQ(ask(R"({"authLevel": 2})"), std::pair(true, true));
  EXPECT_EQ(ask(R"({"authLevel": 3})"), std::pair(true, false));
}

TEST_F(Permission, AuthLevelThatIsNoIntegerAsksForALogin) {
  for (const char* description :
       {R"({"authLevel": null})", R"({"authLevel": "none"})", R"({"authLevel": []})",
        R"({"authLevel": "0"})", R"({"authLevel": "2"})", R"({"authLevel": false})",
        R"({"authLevel": 0.5})", R"({"authLevel": 0.0})", R"({"authLevel": 2.0})",
        R"({"authLevel": {"0": 0}})", R"({"authLevel": 4294967296})"}) {
    entry_->Request()->InitAPIInfo(Parse(description));
    EXPECT_TRUE(entry_->NeedPermission(entry_->Request())) << description;
    EXPECT_FALSE(entry_->SkipPermission(entry_->Request())) << description;
  }
}

TEST_F(Permission, NullRequestNeedsItAndIsNeitherSkippedNorPassed) {
  EXPECT_TRUE(entry_->NeedPermission(nullptr));
  EXPECT_FALSE(entry_->SkipPermission(nullptr));
  EXPECT_FALSE(entry_->CheckPermission(nullptr, entry_->Response()));
  EXPECT_FALSE(entry_->CheckPermission(entry_->Request(), nullptr));
}

TEST_F(Permission, EveryResultHasItsErrorAndServerError) {
  EXPECT_EQ(CheckResult(-9), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-8), "refused 150 errorip");
  EXPECT_EQ(CheckResult(-7), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-6), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-5), "refused 119 unauth");
  EXPECT_EQ(CheckResult(-4), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-3), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-2), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(-1), "refused 106 timeout");
  EXPECT_EQ(CheckResult(0), "refused 105 noprivilege");
  EXPECT_EQ(CheckResult(1), "passed 0 ");
  EXPECT_EQ(CheckResult(2), "passed 0 ");
  EXPECT_EQ(CheckResult(3), "refused 105 noprivilege");
}

TEST_F(Permission, RefusalBodyHasTheCodeAlone) {
  platform->authorized = -1;
  EXPECT_FALSE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Response()->GetBody(), Parse(R"({"success": false, "error": {"code": 106}})"));
}

TEST_F(Permission, AuthorisationClearsAnErrorSetBefore) {
  Describe(kOpenToAll);
  MakeRequest(*entry_);
  entry_->Response()->SetError(117);
  EXPECT_TRUE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(entry_->Response()->GetError(), 0);
}

TEST_F(Permission, NeitherSessionNorTokenIsNoPrivilege) {
  Describe(kOpenToAll);
  MakeRequest(*entry_, "");
  EXPECT_FALSE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
  EXPECT_EQ(entry_->Response()->GetServerError(), "noprivilege");
  EXPECT_EQ(entry_->Request()->GetAuthResult(), AUTHORIZED_NO_SESSION);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "(unset)");
}

TEST_F(Permission, TokenMismatchIsLoggedForAnApiThatNeedsALogin) {
  platform->authorized = -7;
  EXPECT_FALSE(Check(kOpenToAll));
  ASSERT_EQ(SyslogCapture::Messages().size(), 2U);  // and the one that tells to whom
  EXPECT_EQ(SyslogCapture::Messages()[0].text, "WebEntry:577 Token Authentication Fail.");
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
}

TEST_F(Permission, TokenMismatchIsNotLoggedForAnApiThatIsSkipped) {
  platform->authorized = -7;
  EXPECT_FALSE(Check(R"({"authLevel": 2})"));
  EXPECT_EQ(SyslogCapture::Count("Token Authentication Fail."), 0);
}

TEST_F(Permission, TokenMismatchIsLoggedForAMethodThatAllowsTimeoutToo) {
  platform->authorized = -7;
  EXPECT_FALSE(Check(kOpenToAll, R"({"allowTimeout": true})"));
  EXPECT_EQ(SyslogCapture::Count("WebEntry:577 Token Authentication Fail."), 1);
}

TEST_F(Permission, TokenMismatchOfTheOtherAllowanceIsNotLogged) {
  platform->authorized = -7;
  Describe(kOpenToAll, R"({"allowTimeout": true})");
  MakeRequest(*entry_);
  EXPECT_EQ(entry_->CheckPermission(false), 105);
  platform->authorized = -6;
  EXPECT_FALSE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(SyslogCapture::Count("Token Authentication Fail."), 0);
}

TEST_F(Permission, TokenMismatchIsNotLoggedForAnotherLevelThanLogin) {
  platform->authorized = -7;
  for (const int level : {0, 2, 3}) {
    Json::Value keys = Parse(kOpenToAll);
    keys["authLevel"] = level;
    EXPECT_FALSE(Check(JsonHelper::toString(keys), R"({"allowTimeout": true})"));
    EXPECT_EQ(entry_->Response()->GetError(), 105);
  }
  EXPECT_EQ(SyslogCapture::Count("Token Authentication Fail."), 0);
}

TEST_F(Permission, ResultOfZeroIsRefusedWithItsUserKnownAndNoTokenAsked) {
  token = "T";
  platform->tokenGrant = 0;
  platform->tokenUser = "bob";
  platform->authorized = 0;
  EXPECT_FALSE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
  EXPECT_EQ(entry_->Response()->GetServerError(), "noprivilege");
  EXPECT_EQ(Calls("QeloAccessTokenGrant"), 0);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "ann");
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "ann");
  EXPECT_FALSE(entry_->Request()->IsAuthorized());
  EXPECT_EQ(entry_->Request()->GetAuthResult(), 0);
}

TEST_F(Permission, OtherRefusalsAreNotLoggedAsTokenFailure) {
  platform->authorized = -6;
  EXPECT_FALSE(Check(kOpenToAll));
  EXPECT_EQ(SyslogCapture::Count("Token Authentication Fail."), 0);
}

TEST_F(Permission, CgiLibraryIsToldTimeoutAddressAndWhereTheSessionCameFrom) {
  Check(kOpenToAll);
  EXPECT_EQ(platform->calls.back(), "QLIBGroupIsAdminGroupMem(ann)");
  EXPECT_EQ(platform->calls[platform->calls.size() - 2], "QeloCgiIsAuthorizedEx(0, 0, 1)");

  platform->calls.clear();
  TestEntry entry;
  Describe(kOpenToAll, R"({"allowTimeout": true, "skipCheckIP": true})");
  MakeRequest(entry, "S", R"({"_sid": "S"})");
  entry.CheckPermission(entry.Request(), entry.Response());
  EXPECT_EQ(platform->calls[platform->calls.size() - 2], "QeloCgiIsAuthorizedEx(1, 1, 0)");
}

TEST_F(Permission, CgiLibraryIsToldThatTheMethodKeepsTheSessionIdle) {
  Describe(kOpenToAll, R"({"keepIdle": true})");
  MakeRequest(*entry_);
  EXPECT_TRUE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 1);
  EXPECT_EQ(platform->calls[platform->calls.size() - 2], "QeloCgiIsAuthorizedEx(0, 0, 1, idle)");
}

TEST_F(Permission, CompoundRequestKeepsTheSessionIdleWhenAllItsEntriesDo) {
  Describe(kOpenToAll, R"({"keepIdle": true})");
  const auto asked = [&](const std::string& entries) {
    platform->calls.clear();
    TestEntry entry;
    MakeRequest(entry);
    Json::Value params;
    params["getParam"] = Parse(R"({"api": "QELO.Entry.Request", "version": 1, "method": "request",
                                   "compound": )" +
                               entries + "}");
    entry.Request()->InitParam(params, false);
    entry.CheckPermission(false);
    return platform->calls.size() < 2 ? "" : platform->calls[platform->calls.size() - 2];
  };
  const std::string idle = R"({"api": "QELO.Test.Good", "version": 1, "method": "echo"})";
  const std::string other = R"({"api": "QELO.Test.Good", "version": 1, "method": "other"})";
  EXPECT_EQ(asked("[" + idle + "," + idle + "]"), "QeloCgiIsAuthorizedEx(0, 0, 1, idle)");
  EXPECT_EQ(asked("[" + idle + "," + other + "]"), "QeloCgiIsAuthorizedEx(0, 0, 1)");
  EXPECT_EQ(asked("[" + idle + ", 5]"), "QeloCgiIsAuthorizedEx(0, 0, 1)");
}

TEST_F(Permission, SecondCheckWithTheSameAllowanceAsksNobody) {
  Describe(kOpenToAll);
  MakeRequest(*entry_);
  EXPECT_EQ(entry_->CheckPermission(false), 0);
  platform->authorized = -1;
  EXPECT_EQ(entry_->CheckPermission(false), 0);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 1);
  EXPECT_EQ(entry_->CheckPermission(true), 106);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 2);
  EXPECT_EQ(entry_->Request()->GetAuthResult(), AUTHORIZED_TIMED_OUT);
  EXPECT_EQ(entry_->CheckPermission(false), 0);
  EXPECT_EQ(entry_->Request()->GetAuthResult(), AUTHORIZED_YES);
  EXPECT_EQ(entry_->CheckPermission(true), 106);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 2);
}

TEST_F(Permission, RefusedSessionLeavesNoUserBehind) {
  platform->authorized = -1;
  Check(kOpenToAll);
  EXPECT_EQ(entry_->Request()->GetLoginUserName(), "");
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "(unset)");
}

TEST_F(Permission, UserWhoCannotBeToldToProgramsIsNobodyRatherThanTheFormer) {
  Set("QELO_WEBAPI_USERNAME", "former");
  const FailingSetenv failing("QELO_WEBAPI_USERNAME");
  EXPECT_TRUE(Check(kOpenToAll));
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "(unset)");
}

TEST_F(Permission, SessionIsFilledFromTheCgiLibrary) {
  platform->authorized = 2;
  platform->isAdmin = 1;
  platform->language = "fre";
  platform->tokenEnable = 1;
  platform->options = {{"sessfile", "/sessions/S"}, {"istimeout", "1"}, {"timeout", "900"},
                       {"skipcheckip", "1"},        {"app", "Desk"},    {"webapi", "all"}};
  EXPECT_TRUE(Check(R"({"allowUser": ["admin.local"], "appPriv": "Files"})"));
  EXPECT_EQ(entry_->Request()->Serialize()["session"],
            Parse(R"({"username": "ann", "isAdmin": true, "sessFile": "/sessions/S",
                      "isTimeout": true, "timeout": 900, "isSkipCheckIP": true, "uiLang": "fre",
                      "app": "Desk", "webapi": "all", "isAuthorized": true, "tokenEnable": true,
                      "appPriv": "Files", "authResult": 2})"));
  EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "ann");
}

TEST_F(Permission, SessionWithoutOptionsTakesTheirDefaults) {
  EXPECT_TRUE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Request()->Serialize()["session"],
            Parse(R"({"username": "ann", "isAdmin": false, "sessFile": "", "isTimeout": false,
                      "timeout": 0, "isSkipCheckIP": false, "uiLang": "enu", "app": "",
                      "webapi": "", "isAuthorized": true, "tokenEnable": false, "appPriv": "",
                      "authResult": 1})"));
}

TEST_F(Permission, TimeoutIsReadAsADecimalNumberUpToWhatIsNone) {
  const std::pair<const char*, int> cases[] = {{"900", 900}, {"010", 10}, {"0x10", 0},
                                               {"12.5", 12}, {"60s", 60}, {"-5", -5},
                                               {"", 0},      {"never", 0}};
  for (const auto& [text, seconds] : cases) {
    platform->options = {{"timeout", text}};
    EXPECT_TRUE(Check(kOpenToAll));
    EXPECT_EQ(entry_->Request()->GetTimeoutDuration(), seconds) << text;
  }
}

TEST_F(Permission, HostThatCannotTellMakesNobodyAnAdministrator) {
  platform->isAdmin = -1;
  Check(kOpenToAll);
  EXPECT_FALSE(entry_->Request()->IsAdmin());
}

TEST_F(Permission, ApiWithoutAllowUserRefusesEverybody) {
  EXPECT_FALSE(Check("{}"));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
  EXPECT_FALSE(entry_->Response()->HasServerError());
}

TEST_F(Permission, AllowUserThatIsEmptyOrNoListRefuses) {
  for (const char* keys : {R"({"allowUser": []})", R"({"allowUser": "normal.local"})",
                           R"({"allowUser": {"normal.local": true}})", R"({"allowUser": [5]})"}) {
    EXPECT_FALSE(Check(keys)) << keys;
    EXPECT_EQ(entry_->Response()->GetError(), 105) << keys;
  }
}

TEST_F(Permission, AllowUserThatIsNullRefusesAndTakesThePlaceOfTheApisToo) {
  EXPECT_FALSE(Check(R"({"allowUser": null})"));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
  EXPECT_FALSE(Check(kOpenToAll, R"({"allowUser": null})"));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
  EXPECT_TRUE(Check(R"({"allowUser": null})", kOpenToAll));
}

TEST_F(Permission, AllowUserNamesTheCallersClass) {
  EXPECT_TRUE(Check(R"({"allowUser": ["admin.local", "normal.local"]})"));
}

TEST_F(Permission, AdministratorIsNoNormalUser) {
  platform->isAdmin = 1;
  EXPECT_FALSE(Check(R"({"allowUser": ["normal.local"]})"));
}

TEST_F(Permission, AdministratorWithABackslashIsADomainAdministrator) {
  platform->isAdmin = 1;
  platform->authorizedUser = "CORP\\ann@x";
  EXPECT_TRUE(Check(R"({"allowUser": ["admin.domain"]})"));
}

TEST_F(Permission, NormalUserWithAnAtSignIsAnLdapUser) {
  platform->authorizedUser = "ann@corp";
  EXPECT_TRUE(Check(R"({"allowUser": ["normal.ldap"]})"));
}

TEST_F(Permission, MethodsAllowUserTakesThePlaceOfTheApis) {
  EXPECT_FALSE(Check(kOpenToAll, R"({"allowUser": ["admin.local"]})"));
  EXPECT_TRUE(Check(R"({"allowUser": ["admin.local"]})", R"({"allowUser": ["normal.local"]})"));
}

TEST_F(Permission, SessionWithoutAUserNameIsRefused) {
  platform->authorizedUser = "";
  EXPECT_FALSE(Check(kOpenToAll));
  EXPECT_EQ(entry_->Response()->GetError(), 105);
}

TEST_F(Permission, MissingApplicationPrivilegeSets160) {
  platform->appPriv = 0;
  EXPECT_FALSE(Check(R"({"allowUser": ["normal.local"], "appPriv": "Files"})"));
  EXPECT_EQ(entry_->Response()->GetError(), 160);
  EXPECT_FALSE(entry_->Response()->HasServerError());
  EXPECT_EQ(platform->calls.back(), "QLIBAppPrivUserHas(ann, Files, 192.0.2.7)");
}

TEST_F(Permission, EmptyApplicationPrivilegeIsNotAskedFor) {
  platform->appPriv = 0;
  EXPECT_TRUE(Check(R"({"allowUser": ["normal.local"], "appPriv": ""})"));
  EXPECT_EQ(Calls("QLIBAppPrivUserHas"), 0);
}

TEST_F(Permission, ApplicationPrivilegeThatIsNullIsNotAskedFor) {
  platform->appPriv = 0;
  EXPECT_TRUE(Check(R"({"allowUser": ["normal.local"], "appPriv": null})"));
  EXPECT_EQ(Calls("QLIBAppPrivUserHas"), 0);
}

TEST_F(Permission, ApplicationPrivilegeThatIsNoTextIsHeldByNobody) {
  for (const char* appPriv : {R"(["Files"])", "{}", "[]", "false", "0.5", "1"}) {
    const std::string keys = R"({"allowUser": ["normal.local"], "appPriv": )";
    EXPECT_FALSE(Check(keys + appPriv + "}")) << appPriv;
    EXPECT_EQ(entry_->Response()->GetError(), 160) << appPriv;
  }
  EXPECT_EQ(Calls("QLIBAppPrivUserHas"), 0);
}

// A compound request's entries bring requests of their own, whose caller is the outer one's.
TEST_F(Permission, RequestWithinTheRequestGetsTheCallersSession) {
  Describe(kOpenToAll);
  MakeRequest(*entry_);
  APIRequest inner(*entry_->Request());
  APIResponse response(&inner);
  EXPECT_TRUE(entry_->CheckPermission(&inner, &response));
  EXPECT_EQ(inner.GetLoginUserName(), "ann");
  EXPECT_TRUE(inner.IsAuthorized());
  EXPECT_EQ(inner.GetAuthResult(), AUTHORIZED_YES);
}

TEST_F(Permission, RequestWithinTheRequestKeepsNoSessionOfTheOneBefore) {
  Describe(kOpenToAll);
  MakeRequest(*entry_);
  platform->authorized = -1;
  APIRequest inner(*entry_->Request());
  inner.InitSession(Parse(R"({"username": "ann", "isAuthorized": true, "isAdmin": true})"));
  APIResponse response(&inner);
  EXPECT_FALSE(entry_->CheckPermission(&inner, &response));
  EXPECT_EQ(inner.GetLoginUserName(), "");
  EXPECT_FALSE(inner.IsAuthorized());
  EXPECT_FALSE(inner.IsAdmin());
  EXPECT_EQ(inner.GetUILanguage(), "enu");
}

}  // namespace
}  // namespace QELO
