#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/Method.h"

namespace QELO {

/// A method's call by alice, with parameters as they are on the wire's other side.
class MethodTest : public testing::Test {
 protected:
  using Function = void (*)(APIRequest*, APIResponse*);

  void SetUp() override {
    FakePlatform::Reset();
    SyslogCapture::Clear();
    Ask("{}");
  }

  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// The request is one with these parameters, the response as the framework presets it.
  void Ask(const std::string& params) {
    Json::Value init;
    init["session"]["username"] = "alice";
    init["getParam"] = Parse(params);
    request = std::make_unique<APIRequest>(init);
    response = std::make_unique<APIResponse>(request.get());
    response->SetError(WEBAPI_ERR_NO_ANSWER);
  }

  /// The body of the answer, as text.
  std::string Body() const { return JsonHelper::toString(response->GetBody()); }

  std::string Answer(Function method, const std::string& params = "{}") {
    Ask(params);
    method(request.get(), response.get());
    return Body();
  }

  /// What error 101 tells, a word each: "/name required, /size maximum". "" for another answer.
  std::string Faults(Function method, const std::string& params) {
    Answer(method, params);
    std::string text;
    const Json::Value body = response->GetBody();
    for (const Json::Value& fault : JsonHelper::member(body["error"], "errors")) {
      EXPECT_FALSE(JsonHelper::asString(fault["message"]).empty());
      text += (text.empty() ? "" : ", ") + JsonHelper::asString(fault["path"]) + " " +
              JsonHelper::asString(fault["rule"]);
    }
    EXPECT_EQ(response->GetError(), text.empty() ? 0 : WEBAPI_ERR_BAD_REQUEST) << Body();
    return text;
  }

  std::unique_ptr<APIRequest> request;
  std::unique_ptr<APIResponse> response;
};

}  // namespace QELO
