// QELO.Access.Session as its callers see it.

#include <gtest/gtest.h>
#include <webapi/testing/TestHost.h>

#include "tests/support/FakePlatform.h"

namespace {

using QELO::TestAnswer;
using QELO::TestHost;

class Session : public testing::Test {
 protected:
  Session() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Access.Session.lib.in"));
    host.AddUser("alice", 1001);
    FakePlatform::Get().passwordCheck = 1;
  }
  TestAnswer Call(const std::string& method, const TestHost::Params& params = {}) {
    return host.Call("QELO.Access.Session", 1, method, params);
  }
  TestAnswer LogIn() { return Call("login", {{"account", "alice"}, {"password", "secret"}}); }

  TestHost host;
};

TEST_F(Session, LoginAnswersATicketAndACookie) {
  const TestAnswer answer = LogIn();
  const std::string id(43, 'i');
  EXPECT_EQ(answer.Data()["sid"], id) << answer;
  EXPECT_EQ(answer.Data()["token"], std::string(43, 't'));
  EXPECT_EQ(answer.Data()["user"], "alice");
  EXPECT_EQ(answer.Header("Set-Cookie").find("id=" + id), 0U);
  EXPECT_EQ(answer.Header("x-request-error"), "");
  EXPECT_EQ(answer.account, "root");
}

TEST_F(Session, PasswordMayLookLikeANumber) {
  EXPECT_TRUE(
      host.CallLine("QELO.Access.Session", 1, "login", "account=1&password=12345").IsSuccess());
}

TEST_F(Session, RefusedLoginsHaveCodes) {
  FakePlatform::Get().passwordCheck = 0;
  EXPECT_EQ(LogIn().body, R"({"error":{"code":400},"success":false})");
  FakePlatform::Get().passwordCheck = -1;
  EXPECT_EQ(LogIn().Code(), 401);
  FakePlatform::Get().loginAttempt = 30;
  const TestAnswer answer = LogIn();
  EXPECT_EQ(answer.Code(), 407);
  EXPECT_EQ(answer.Errors()["retry_after"], 30);
  EXPECT_EQ(answer.Header("Retry-After"), "30");
  EXPECT_EQ(Call("login").body, R"({"error":{"code":101},"success":false})");
}

TEST_F(Session, OthersAreForWhoIsLoggedIn) {
  EXPECT_EQ(Call("current").Code(), 105);
  EXPECT_EQ(Call("logout").Code(), 105);
  host.LogIn("alice", "2001:db8::1");
  const Json::Value data = Call("current").Data();
  EXPECT_EQ(data["user"], "alice");
  EXPECT_EQ(data["class"], "normal.local");
  EXPECT_EQ(data["address"], "2001:db8::1");
  EXPECT_EQ(data["secondsLeft"], 900);
}

}  // namespace
