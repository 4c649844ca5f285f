// What the log says of a call that the permission check refuses.

#include <syslog.h>

#include <algorithm>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/entry/permission/Fixture.h"

namespace QELO {
namespace {

class Refusal : public Permission {
 protected:
  /// The lines of the last check about refused calls, without source and line.
  static std::vector<std::string> Lines() {
    std::vector<std::string> lines;
    for (const auto& [priority, text] : SyslogCapture::Messages()) {
      if (text.find("call refused") != std::string::npos) {
        EXPECT_EQ(priority, LOG_AUTH | LOG_NOTICE);
        EXPECT_EQ(text.find("WebEntry.cpp:"), 0U) << text;
        lines.push_back(text.substr(text.find(' ') + 1));
      }
    }
    SyslogCapture::Clear();
    return lines;
  }

  /// What the log says when the CGI library answers this.
  std::vector<std::string> LinesOf(int result, const std::string& keys = kOpenToAll) {
    SyslogCapture::Clear();
    platform->authorized = result;
    Check(keys);
    return Lines();
  }

  static std::vector<std::string> Of(const std::string& reason, const std::string& account = "") {
    return {"call refused from 192.0.2.7: " + reason + "; account [" + account + "]"};
  }
};

TEST_F(Refusal, EveryResultOfTheSessionHasItsReason) {
  EXPECT_EQ(LinesOf(-8), Of("the session is bound to another address"));
  EXPECT_EQ(LinesOf(-7), Of("the anti-forgery token is missing or wrong"));
  EXPECT_EQ(LinesOf(-6), Of("the session's account may not come in"));
  EXPECT_EQ(LinesOf(-5), Of("no such session, or its account is gone"));
  EXPECT_EQ(LinesOf(-4), Of("what was sent is no session id"));
  EXPECT_EQ(LinesOf(-3), Of("the session cannot be read"));
  EXPECT_EQ(LinesOf(-1), Of("the session has timed out"));
}

TEST_F(Refusal, PermittedCallLeavesNoLine) {
  EXPECT_EQ(LinesOf(1), std::vector<std::string>());
  EXPECT_EQ(LinesOf(2), std::vector<std::string>());
}

TEST_F(Refusal, CallWithoutSessionIsToldAsSuch) {
  Describe(kOpenToAll);
  MakeRequest(*entry_, "");
  SyslogCapture::Clear();
  entry_->CheckPermission(entry_->Request(), entry_->Response());
  EXPECT_EQ(Lines(), Of("not logged in"));
}

TEST_F(Refusal, AccessTokenIsNamedWithoutItsText) {
  token = "SECRET";
  EXPECT_EQ(LinesOf(-5), Of("the access token is unknown, has expired or is for other calls"));
}

TEST_F(Refusal, UserClassThatIsNotListedIsNamed) {
  EXPECT_EQ(LinesOf(1, R"({"allowUser": ["admin.local"]})"),
            Of("\"allowUser\" does not list normal.local", "ann"));
  EXPECT_EQ(LinesOf(1, "{}"), Of("\"allowUser\" does not list normal.local", "ann"));
}

TEST_F(Refusal, ApplicationPrivilegeThatIsMissingIsNamed) {
  platform->appPriv = 0;
  EXPECT_EQ(LinesOf(1, R"({"allowUser": ["normal.local"], "appPriv": "Files"})"),
            Of("the application privilege Files is missing", "ann"));
}

TEST_F(Refusal, CheckThatIsAskedInVainLeavesNoLine) {
  EXPECT_EQ(LinesOf(-2, R"({"authLevel": 2})"), std::vector<std::string>());
  platform->authorized = -2;
  Describe(kOpenToAll);
  MakeRequest(*entry_);
  Json::Value params;
  params["postParam"] =
      Parse(R"({"api": "QELO.Entry.Request", "version": 1, "method": "request"})");
  entry_->Request()->InitParam(params, true);
  SyslogCapture::Clear();
  EXPECT_FALSE(entry_->CheckPermission(entry_->Request(), entry_->Response()));
  EXPECT_EQ(Lines(), std::vector<std::string>());
}

TEST_F(Refusal, UnknownAddressIsCalledSo) {
  Describe(kOpenToAll);
  MakeRequest(*entry_, "");
  Json::Value environment;
  environment["QELO_REMOTE_IP"] = "";
  entry_->Request()->InitEnv(environment);
  SyslogCapture::Clear();
  entry_->CheckPermission(entry_->Request(), entry_->Response());
  EXPECT_EQ(Lines(),
            std::vector<std::string>{"call refused from unknown: not logged in; account []"});
}

TEST_F(Refusal, NameOfAnAccountIsCut) {
  platform->authorizedUser = std::string(400, 'a');
  SyslogCapture::Clear();
  Check("{}");
  const std::vector<std::string> lines = Lines();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_NE(lines[0].find("aaa... (400 bytes)]"), std::string::npos) << lines[0];
}

}  // namespace
}  // namespace QELO
