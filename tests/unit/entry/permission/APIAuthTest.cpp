#include "webapi/APIAuth.h"

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

class APIAuthTest : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->authorized = 1;
    platform->authorizedUser = "ann";
    Set("HTTP_COOKIE", "id=S");
    request_.InitEnv(Parse(R"({"HTTP_COOKIE": "id=S", "QELO_REMOTE_IP": "192.0.2.7"})"));
    request_.InitAPIInfo(Parse(R"({"allowUser": ["normal.local"]})"));
  }

  /// The check's error code, 0 when it passed.
  int Check(const char* session = "S", bool allowTimeout = false) {
    response_.SetSuccess();
    const bool passed = APIAuth::CheckPermission(&request_, &response_, session, allowTimeout);
    EXPECT_EQ(passed, response_.GetError() == 0);
    return response_.GetError();
  }

  bool MayCall(const std::string& description, const std::string& attributes = "{}") {
    return APIAuth::MayCall(request_, Parse(description), Parse(attributes));
  }

  APIRequest request_;
  APIResponse response_{&request_};
};

TEST_F(APIAuthTest, UserClassNamesRoleAndAccountKind) {
  EXPECT_EQ(APIAuth::GetUserClass(true, "ann"), "admin.local");
  EXPECT_EQ(APIAuth::GetUserClass(true, "CORP\\ann"), "admin.domain");
  EXPECT_EQ(APIAuth::GetUserClass(true, "ann@corp"), "admin.ldap");
  EXPECT_EQ(APIAuth::GetUserClass(false, "ann"), "normal.local");
  EXPECT_EQ(APIAuth::GetUserClass(false, "CORP\\ann@x"), "normal.domain");
  EXPECT_EQ(APIAuth::GetUserClass(false, "ann@corp"), "normal.ldap");
}

TEST_F(APIAuthTest, CheckAllowUserAsksTheApisListAlone) {
  EXPECT_TRUE(APIAuth::CheckAllowUser(&request_, "bob"));
  EXPECT_FALSE(APIAuth::CheckAllowUser(&request_, "bob@corp"));
  request_.InitSession(Parse(R"({"isAdmin": true})"));
  EXPECT_FALSE(APIAuth::CheckAllowUser(&request_, "bob"));
}

TEST_F(APIAuthTest, CheckAllowUserRefusesWithoutListOrUser) {
  EXPECT_FALSE(APIAuth::CheckAllowUser(nullptr, "bob"));
  EXPECT_FALSE(APIAuth::CheckAllowUser(&request_, nullptr));
  EXPECT_FALSE(APIAuth::CheckAllowUser(&request_, ""));
  for (const char* description : {"{}", R"({"allowUser": []})", R"({"allowUser": "normal.local"})",
                                  R"({"allowUser": ["admin.local"]})"}) {
    request_.InitAPIInfo(Parse(description));
    EXPECT_FALSE(APIAuth::CheckAllowUser(&request_, "bob")) << description;
  }
}

TEST_F(APIAuthTest, CheckPermissionMapsEveryResult) {
  const std::map<int, int> expected = {{-9, 105}, {-8, 150}, {-7, 105}, {-6, 105}, {-5, 105},
                                       {-4, 105}, {-3, 107}, {-2, 105}, {-1, 106}, {0, 105},
                                       {1, 0},    {2, 0},    {3, 105}};
  for (const auto& [result, code] : expected) {
    platform->authorized = result;
    EXPECT_EQ(Check(), code) << result;
  }
}

TEST_F(APIAuthTest, CheckPermissionAsksTheNamedUserStore) {
  EXPECT_EQ(Check("S", true), 0);
  EXPECT_EQ(platform->calls[0], "QeloCgiInitEx(current.users)");
  EXPECT_EQ(platform->calls[1], "QeloCgiLoadInCookies()");
  EXPECT_EQ(platform->calls[2], "QeloCgiIsAuthorizedEx(0, 1, 1)");
}

TEST_F(APIAuthTest, CheckPermissionTellsASessionThatCameAsAParameter) {
  request_.InitParam(Parse(R"({"getParam": {"_sid": "S"}})"), false);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(platform->calls[2], "QeloCgiIsAuthorizedEx(1, 0, 1)");
}

TEST_F(APIAuthTest, CheckPermissionIgnoresAnotherSidParameter) {
  request_.InitParam(Parse(R"({"getParam": {"_sid": "anything"}})"), false);
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(platform->calls[2], "QeloCgiIsAuthorizedEx(0, 0, 1)");
}

TEST_F(APIAuthTest, CheckPermissionRefusesANullSession) {
  EXPECT_EQ(Check(nullptr), 105);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
}

TEST_F(APIAuthTest, CheckPermissionRefusesASessionThatIsNotTheRequests) {
  EXPECT_EQ(Check("OTHER"), 105);
  Set("HTTP_COOKIE", "id=OTHER");
  EXPECT_EQ(Check("OTHER"), 105);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
}

TEST_F(APIAuthTest, CheckPermissionRefusesASessionThatIsNotTheProcesss) {
  Set("HTTP_COOKIE", "id=S; id=OTHER");
  EXPECT_EQ(Check(), 105);
  unsetenv("HTTP_COOKIE");
  EXPECT_EQ(Check(), 105);
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
}

TEST_F(APIAuthTest, CheckPermissionRefusesWithoutATimeoutSetting) {
  platform->timeoutSetting = -1;
  EXPECT_EQ(Check(), 105);
}

TEST_F(APIAuthTest, CheckPermissionRefusesWithoutTheUserStore) {
  for (const int result : {0, -1}) {
    platform->cgiInitEx = result;
    EXPECT_EQ(Check(), 105);
  }
  EXPECT_EQ(Calls("QeloCgiIsAuthorizedEx"), 0);
}

TEST_F(APIAuthTest, CheckPermissionRefusesAnotherUserClass) {
  request_.InitAPIInfo(Parse(R"({"allowUser": ["admin.local"]})"));
  EXPECT_EQ(Check(), 105);
  platform->isAdmin = 1;
  EXPECT_EQ(Check(), 0);
}

TEST_F(APIAuthTest, CheckPermissionTakesTheRequestsWordForItsOwnUser) {
  request_.InitAPIInfo(Parse(R"({"allowUser": ["admin.local"]})"));
  request_.InitSession(Parse(R"({"username": "ann", "isAdmin": true})"));
  EXPECT_EQ(Check(), 0);
  request_.InitSession(Parse(R"({"username": "root", "isAdmin": true})"));
  EXPECT_EQ(Check(), 105);
}

TEST_F(APIAuthTest, CheckPermissionRefusesASessionWithoutAUser) {
  platform->authorizedUser = "";
  EXPECT_EQ(Check(), 105);
}

TEST_F(APIAuthTest, CheckPermissionSets160WithoutTheApplicationPrivilege) {
  request_.InitAPIInfo(Parse(R"({"allowUser": ["normal.local"], "appPriv": "Files"})"));
  EXPECT_EQ(Check(), 0);
  EXPECT_EQ(platform->calls.back(), "QLIBAppPrivUserHas(ann, Files, 192.0.2.7)");
  platform->appPriv = 0;
  EXPECT_EQ(Check(), 160);
  platform->appPriv = 1;
  request_.InitAPIInfo(Parse(R"({"allowUser": ["normal.local"], "appPriv": ["Files"]})"));
  EXPECT_EQ(Check(), 160);
}

TEST_F(APIAuthTest, CheckPermissionWithoutRequestOrResponseRefuses) {
  EXPECT_FALSE(APIAuth::CheckPermission(nullptr, &response_, "S", false));
  EXPECT_FALSE(APIAuth::CheckPermission(&request_, nullptr, "S", false));
}

TEST_F(APIAuthTest, UpdateTimeoutRefreshesTheRequestsSession) {
  EXPECT_TRUE(APIAuth::UpdateTimeout(&request_));
  EXPECT_EQ(platform->calls.back(), "QeloSessionRefresh(S)");
  platform->sessionRefresh = -1;
  EXPECT_FALSE(APIAuth::UpdateTimeout(&request_));
}

TEST_F(APIAuthTest, UpdateTimeoutWithoutASessionFails) {
  APIRequest empty;
  EXPECT_FALSE(APIAuth::UpdateTimeout(&empty));
  EXPECT_FALSE(APIAuth::UpdateTimeout(nullptr));
  EXPECT_EQ(Calls("QeloSessionRefresh"), 0);
}

TEST_F(APIAuthTest, MayCallWhatNeedsNoLogin) {
  EXPECT_TRUE(MayCall(R"({"authLevel": 0})"));
  EXPECT_TRUE(MayCall(R"({"authLevel": 2})"));
  EXPECT_FALSE(MayCall(R"({"authLevel": 1, "allowUser": ["normal.local"]})"));
  for (const char* level : {"null", "false", "0.5", "\"0\"", "\"2\"", "[]"}) {
    EXPECT_FALSE(
        MayCall(std::string(R"({"allowUser": ["normal.local"], "authLevel": )") + level + "}"))
        << level;
  }
}

TEST_F(APIAuthTest, MayCallByClassPrivilegeAndAuthorisation) {
  const char* open = R"({"allowUser": ["normal.local"]})";
  request_.InitSession(Parse(R"({"username": "ann", "isAuthorized": true})"));
  EXPECT_TRUE(MayCall(open));
  EXPECT_FALSE(MayCall("{}"));
  EXPECT_FALSE(MayCall(open, R"({"allowUser": ["admin.local"]})"));
  EXPECT_TRUE(MayCall(R"({"allowUser": []})", R"({"allowUser": ["normal.local"]})"));
  platform->appPriv = 0;
  EXPECT_TRUE(MayCall(open));
  EXPECT_FALSE(MayCall(R"({"allowUser": ["normal.local"], "appPriv": "Files"})"));
  EXPECT_FALSE(MayCall(R"({"allowUser": ["normal.local"], "appPriv": ["Files"]})"));
  request_.InitSession(Parse(R"({"username": "ann", "isAuthorized": false})"));
  EXPECT_FALSE(MayCall(open));
  request_.InitSession(Parse(R"({"username": "", "isAuthorized": true})"));
  EXPECT_FALSE(MayCall(open));
}

}  // namespace
}  // namespace QELO
