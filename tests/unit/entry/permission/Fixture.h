#pragma once

#include <memory>
#include <string>

#include "tests/support/CgiFixture.h"

namespace QELO {

/// Entries whose caller's session the CGI library answers as a test wants it.
class Permission : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->authorized = 1;
    platform->authorizedUser = "ann";
  }

  /// Makes the entry's request a call of QELO.Test.Good, with this session id and parameters.
  void MakeRequest(TestEntry& entry, const std::string& sessionId = "S",
                   const std::string& extra = "{}") {
    Json::Value environment;
    environment["HTTP_COOKIE"] = "id=" + sessionId;
    environment["QELO_REMOTE_IP"] = "192.0.2.7";
    if (!token.empty()) {
      environment["qeloAccessToken"] = token;
    }
    entry.Request()->InitEnv(environment);
    Json::Value params;
    params["getParam"] = Parse(extra);
    params["getParam"]["api"] = "QELO.Test.Good";
    params["getParam"]["version"] = 1;
    params["getParam"]["method"] = "echo";
    entry.Request()->InitParam(params, false);
    entry.CheckRequestParam(entry.Request(), entry.Response());
    entry.AddAPIInfo(entry.Request());
  }

  /// A fresh entry's full check of a call whose description has these keys and attributes.
  bool Check(const std::string& keys, const std::string& attributes = "{}") {
    entry_ = std::make_unique<TestEntry>();
    Describe(keys, attributes);
    MakeRequest(*entry_);
    return entry_->CheckPermission(entry_->Request(), entry_->Response());
  }

  /// The full check when the CGI library answers this, with the error and server error as text.
  std::string CheckResult(int result) {
    platform->authorized = result;
    TestEntry entry;
    Describe(kOpenToAll);
    MakeRequest(entry);
    const bool passed = entry.CheckPermission(entry.Request(), entry.Response());
    return std::string(passed ? "passed " : "refused ") +
           std::to_string(entry.Response()->GetError()) + " " + entry.Response()->GetServerError();
  }

  static constexpr char kOpenToAll[] =
      R"({"allowUser": ["admin.local", "admin.domain", "admin.ldap",
                        "normal.local", "normal.domain", "normal.ldap"]})";
  std::string token;
  std::unique_ptr<TestEntry> entry_ = std::make_unique<TestEntry>();
};

}  // namespace QELO
