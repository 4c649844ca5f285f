#include "webapi/LoginSession.h"

#include <gtest/gtest.h>

#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <memory>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIRequest.h"

namespace QELO {
namespace {

class LoginSessionTest : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    platform->passwordCheck = 1;
    SyslogCapture::Clear();
    unsetenv("REQUEST_METHOD");
    SetEnv("QELO_REMOTE_IP", "192.0.2.7");
    SetEnv("REQUEST_METHOD", "POST");
    ticket_.id = ticket_.token = ticket_.user = "before";
  }

  LoginSession::Result Login(const std::string& account = "ann",
                             const std::string& password = "secret") {
    return LoginSession::Login(*request_, account, password, ticket_);
  }

  void SetEnv(const char* name, const char* value) {
    Json::Value environment;
    environment[name] = value;
    request_->InitEnv(environment);
  }

  /// Expects the one line of the last attempts, at this level of the authorisation facility.
  void ExpectLine(int level, const std::string& text) {
    ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
    const auto& [priority, message] = SyslogCapture::Messages()[0];
    EXPECT_EQ(priority, LOG_AUTH | level);
    EXPECT_EQ(message.find("LoginSession.cpp:"), 0U) << message;
    EXPECT_EQ(message.substr(message.find(' ') + 1), text);
    SyslogCapture::Clear();
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
  std::unique_ptr<APIRequest> request_ = std::make_unique<APIRequest>();
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
                "QeloLoginAttempt(192.0.2.7, ann)", "QeloLoginPasswordCheck(ann, 192.0.2.7)",
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

TEST_F(LoginSessionTest, EachAttemptIsOneLineWithAddressReasonAndAccount) {
  Login();
  ExpectLine(LOG_INFO, "login accepted from 192.0.2.7: password; account [ann]");
  platform->passwordCheck = 0;
  Login();
  ExpectLine(LOG_NOTICE, "login failed from 192.0.2.7: wrong account or password; account [ann]");
  platform->passwordCheck = 2;
  EXPECT_EQ(Login(), LoginSession::LOGIN_WRONG);
  ExpectNoTicket();
  ExpectLine(LOG_NOTICE,
             "login failed from 192.0.2.7: the account is locked, expired or not for logins; "
             "account [ann]");
  platform->passwordCheck = -1;
  Login();
  ExpectLine(LOG_ERR,
             "login not possible from 192.0.2.7: passwords cannot be checked; account [ann]");
  platform->passwordCheck = 1;
  platform->sessionCreate = -1;
  Login();
  ExpectLine(LOG_ERR, "login not possible from 192.0.2.7: no session can be made; account [ann]");
  platform->loginAttempt = 17;
  Login();
  ExpectLine(LOG_NOTICE,
             "login refused from 192.0.2.7: too many attempts, 17 seconds left; account [ann]");
  platform->loginAttempt = -1;
  Login();
  ExpectLine(LOG_ERR,
             "login not possible from 192.0.2.7: attempts cannot be counted; account [ann]");
}

TEST_F(LoginSessionTest, LineShowsNoControlCharactersAndNoEndlessName) {
  Login("an\nn\x1B[0m");
  ExpectLine(LOG_NOTICE,
             "login failed from 192.0.2.7: wrong account or password; account [an?n?[0m]");
  Login(std::string(100000, 'a'));
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_LT(SyslogCapture::Messages()[0].text.size(), 400U);
}

TEST_F(LoginSessionTest, UnknownAddressIsSaidToBe) {
  SetEnv("QELO_REMOTE_IP", "");
  Login();
  ExpectLine(LOG_INFO, "login accepted from unknown: password; account [ann]");
}

TEST_F(LoginSessionTest, WhatIsNoPostIsRefusedUncounted) {
  for (const char* method : {"GET", "HEAD", "PUT", "post", ""}) {
    request_ = std::make_unique<APIRequest>();
    SetEnv("REQUEST_METHOD", method);
    SetEnv("QELO_REMOTE_IP", "192.0.2.7");
    EXPECT_EQ(Login(), LoginSession::LOGIN_NOT_POST) << method;
    ExpectNoTicket();
    ExpectLine(LOG_NOTICE, "login refused from 192.0.2.7: not sent by POST; account [ann]");
  }
  EXPECT_TRUE(platform->calls.empty());
}

TEST_F(LoginSessionTest, EntryOfARequestThatIsNoPostIsRefused) {
  setenv("REQUEST_METHOD", "GET", 1);
  EXPECT_EQ(Login(), LoginSession::LOGIN_NOT_POST);
  setenv("REQUEST_METHOD", "POST", 1);
  EXPECT_EQ(Login(), LoginSession::LOGIN_OK);
  unsetenv("REQUEST_METHOD");
}

TEST_F(LoginSessionTest, AnotherSitesPageIsRefusedUncounted) {
  SetEnv("HTTP_SEC_FETCH_SITE", "cross-site");
  EXPECT_EQ(Login(), LoginSession::LOGIN_OTHER_SITE);
  ExpectNoTicket();
  ExpectLine(LOG_NOTICE,
             "login refused from 192.0.2.7: sent for another site's page; account [ann]");
  EXPECT_TRUE(platform->calls.empty());
}

TEST_F(LoginSessionTest, OwnPagesMayLogIn) {
  SetEnv("HTTP_ORIGIN", "https://other.example");
  for (const char* site : {"same-origin", "same-site", "none"}) {
    SetEnv("HTTP_SEC_FETCH_SITE", site);
    EXPECT_EQ(Login(), LoginSession::LOGIN_OK) << site;
  }
}

TEST_F(LoginSessionTest, OriginCountsWhereTheBrowserSaysNoMore) {
  struct Case {
    const char* origin;
    const char* host;
    LoginSession::Result result;
  };
  for (const Case& each : {
           Case{"http://nas.example", "nas.example", LoginSession::LOGIN_OK},
           Case{"http://NAS.example:5000", "nas.example:8080", LoginSession::LOGIN_OK},
           Case{"http://[2001:db8::1]:80", "[2001:db8::1]", LoginSession::LOGIN_OK},
           Case{"http://nas.example.evil.example", "nas.example", LoginSession::LOGIN_OTHER_SITE},
           Case{"http://evil.example", "nas.example", LoginSession::LOGIN_OTHER_SITE},
           Case{"null", "nas.example", LoginSession::LOGIN_OTHER_SITE},
           Case{"http://evil.example", "", LoginSession::LOGIN_OTHER_SITE},
       }) {
    request_ = std::make_unique<APIRequest>();
    SetEnv("REQUEST_METHOD", "POST");
    SetEnv("HTTP_ORIGIN", each.origin);
    SetEnv("HTTP_HOST", each.host);
    EXPECT_EQ(Login(), each.result) << each.origin << " " << each.host;
  }
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
