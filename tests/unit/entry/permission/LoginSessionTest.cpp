#include "webapi/LoginSession.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "tests/support/FakePlatform.h"
#include "webapi/APIRequest.h"

namespace QELO {
namespace {

class LoginSessionTest : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    platform->passwordCheck = 1;
    Json::Value environment;
    environment["QELO_REMOTE_IP"] = "192.0.2.7";
    request_.InitEnv(environment);
    ticket_.id = ticket_.token = ticket_.user = "before";
  }

  LoginSession::Result Login(const std::string& account = "ann",
                             const std::string& password = "secret") {
    return LoginSession::Login(request_, account, password, ticket_);
  }

  void ExpectNoTicket() {
    EXPECT_EQ(ticket_.id, "");
    EXPECT_EQ(ticket_.token, "");
    EXPECT_EQ(ticket_.user, "");
  }

  bool Called(const std::string& call) {
    return std::count(platform->calls.begin(), platform->calls.end(), call) > 0;
  }

  FakePlatform* platform = nullptr;
  APIRequest request_;
  LoginSession::Ticket ticket_;
};

TEST_F(LoginSessionTest, RightPasswordGivesATicket) {
  EXPECT_EQ(Login(), LoginSession::LOGIN_OK);
  EXPECT_EQ(ticket_.id, std::string(43, 'i'));
  EXPECT_EQ(ticket_.token, std::string(43, 't'));
  EXPECT_EQ(ticket_.user, "ann");
  EXPECT_EQ(ticket_.retryAfter, 0);
  EXPECT_EQ(platform->calls,
            (std::vector<std::string>{
                "QeloLoginAttempt(192.0.2.7, ann)", "QeloLoginPasswordCheck(ann)",
                "QeloSessionCreate(ann, 192.0.2.7)", "QeloLoginSucceeded(192.0.2.7, ann)"}));
}

TEST_F(LoginSessionTest, WrongPasswordStaysCounted) {
  platform->passwordCheck = 0;
  EXPECT_EQ(Login(), LoginSession::LOGIN_WRONG);
  ExpectNoTicket();
  EXPECT_TRUE(Called("QeloLoginAttempt(192.0.2.7, ann)"));
  EXPECT_FALSE(Called("QeloLoginSucceeded(192.0.2.7, ann)"));
}

TEST_F(LoginSessionTest, PasswordThatCannotBeCheckedFails) {
  platform->passwordCheck = -1;
  EXPECT_EQ(Login(), LoginSession::LOGIN_FAILED);
  ExpectNoTicket();
}

TEST_F(LoginSessionTest, TooManyAttemptsAreRefusedWithoutLooking) {
  platform->loginAttempt = 17;
  EXPECT_EQ(Login(), LoginSession::LOGIN_TOO_MANY);
  EXPECT_EQ(ticket_.retryAfter, 17);
  ExpectNoTicket();
  EXPECT_EQ(platform->calls.size(), 1U);
}

TEST_F(LoginSessionTest, AttemptThatCannotBeCountedFails) {
  platform->loginAttempt = -1;
  EXPECT_EQ(Login(), LoginSession::LOGIN_FAILED);
  EXPECT_EQ(ticket_.retryAfter, 0);
  EXPECT_EQ(platform->calls.size(), 1U);
}

TEST_F(LoginSessionTest, SessionThatCannotBeCreatedFails) {
  platform->sessionCreate = -1;
  EXPECT_EQ(Login(), LoginSession::LOGIN_FAILED);
  ExpectNoTicket();
  EXPECT_FALSE(Called("QeloLoginSucceeded(192.0.2.7, ann)"));
}

TEST_F(LoginSessionTest, EmptyAccountOrPasswordIsWrongUnasked) {
  EXPECT_EQ(Login("", "secret"), LoginSession::LOGIN_WRONG);
  EXPECT_EQ(Login("ann", ""), LoginSession::LOGIN_WRONG);
  EXPECT_TRUE(platform->calls.empty());
  ExpectNoTicket();
}

TEST_F(LoginSessionTest, AccountThatIsNoNameIsCountedAndWrong) {
  for (const std::string& account : {std::string(257, 'a'), std::string("ann\0x", 5),
                                     std::string("an\nn"), std::string("\x7F")}) {
    platform->calls.clear();
    EXPECT_EQ(Login(account), LoginSession::LOGIN_WRONG);
    ASSERT_EQ(platform->calls.size(), 1U);
    EXPECT_EQ(platform->calls[0].find("QeloLoginAttempt("), 0U);
    EXPECT_LE(platform->calls[0].size(),
              256U + std::string("QeloLoginAttempt(192.0.2.7, )").size());
  }
}

TEST_F(LoginSessionTest, AccountOf256BytesIsLookedUp) {
  EXPECT_EQ(Login(std::string(256, 'a')), LoginSession::LOGIN_OK);
}

TEST_F(LoginSessionTest, PasswordWithANulIsCountedAndWrong) {
  EXPECT_EQ(Login("ann", std::string("secret\0x", 8)), LoginSession::LOGIN_WRONG);
  EXPECT_EQ(platform->calls, std::vector<std::string>{"QeloLoginAttempt(192.0.2.7, ann)"});
}

TEST_F(LoginSessionTest, LogoutRemovesTheSession) {
  EXPECT_TRUE(LoginSession::Logout("S"));
  EXPECT_EQ(platform->calls, std::vector<std::string>{"QeloSessionRemove(S)"});
  platform->sessionRemove = -1;
  EXPECT_FALSE(LoginSession::Logout("S"));
  EXPECT_FALSE(LoginSession::Logout(""));
}

TEST_F(LoginSessionTest, SecondsLeftAsksTheSession) {
  EXPECT_EQ(LoginSession::SecondsLeft("S"), 900);
  EXPECT_LT(LoginSession::SecondsLeft(""), 0);
}

}  // namespace
}  // namespace QELO
