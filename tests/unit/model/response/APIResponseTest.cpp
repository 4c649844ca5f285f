#include <gtest/gtest.h>

#include <cstdlib>
#include <stdexcept>
#include <string>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIResponse.h"

using namespace QELO;

namespace {

std::string body(const APIResponse& response) {
  return JsonHelper::toString(response.GetBody());
}

void first(void*) {}
void second(void*) {}

class ResponseCallbacks : public testing::Test {
 protected:
  ResponseCallbacks() {
    unsetenv("in_qeloapid");
    SyslogCapture::Clear();
  }
  ~ResponseCallbacks() override { unsetenv("in_qeloapid"); }

  size_t count() { return response_.GetCallbackFuncs()->size(); }

  APIResponse response_{nullptr};
  int argument_ = 0;
  int other_ = 0;
};

}  // namespace

TEST(Response, HasTheJsonHeaderAndEmptySectionsAtFirst) {
  APIResponse response(nullptr);
  EXPECT_EQ(JsonHelper::toString(response.Serialize()),
            R"({"code":0,"headers":{"Content-type":"application/json; charset=\"UTF-8\""},)"
            R"("option":{},"setCookie":[],"success":{}})");
  EXPECT_EQ(body(response), "{}");
  EXPECT_EQ(response.GetError(), 0);
}

TEST(ResponseBody, OfSuccessHasDataOnlyWhenThereIsSome) {
  APIResponse response(nullptr);
  response.SetSuccess(Json::nullValue);
  EXPECT_EQ(body(response), R"({"success":true})");
  response.SetSuccess(json("[1]"));
  EXPECT_EQ(body(response), R"({"data":[1],"success":true})");
  response.SetSuccess(json("{}"));
  EXPECT_EQ(body(response), R"({"data":{},"success":true})");
  EXPECT_EQ(response.GetError(), 0);
}

TEST(ResponseBody, OfAnErrorHasErrorsOnlyWhenThereAreSome) {
  APIResponse response(nullptr);
  response.SetError(105, Json::nullValue);
  EXPECT_EQ(body(response), R"({"error":{"code":105},"success":false})");
  response.SetError(400, json(R"({"line":3})"));
  EXPECT_EQ(body(response), R"({"error":{"code":400,"errors":{"line":3}},"success":false})");
  EXPECT_EQ(response.GetError(), 400);
}

TEST(ResponseBody, OfErrorZeroIsSuccess) {
  APIResponse response(nullptr);
  response.SetError(0, "x");
  EXPECT_EQ(body(response), R"({"data":"x","success":true})");
}

TEST(ResponseBody, IsReplacedByEachCall) {
  APIResponse response(nullptr);
  response.SetError(400, "x");
  response.SetSuccess("y");
  EXPECT_EQ(body(response), R"({"data":"y","success":true})");
  EXPECT_EQ(response.GetError(), 0);
  response.SetError(-1);
  EXPECT_EQ(body(response), R"({"error":{"code":-1},"success":false})");
}

TEST(ResponseHeaders, AreStoredUnderANonEmptyName) {
  APIResponse response(nullptr);
  EXPECT_FALSE(response.HasHeader("X-Test"));
  EXPECT_EQ(response.GetHeader("X-Test", "default"), "default");
  EXPECT_TRUE(response.SetHeader("X-Test", "value"));
  EXPECT_TRUE(response.HasHeader("X-Test"));
  EXPECT_EQ(response.GetHeader("X-Test", "default"), "value");
  EXPECT_FALSE(response.SetHeader("", "value"));
  EXPECT_EQ(response.GetHeaders().getMemberNames(),
            (std::vector<std::string>{"Content-type", "X-Test"}));
}

TEST(ResponseStatus, IsTwoHundredAtFirst) {
  EXPECT_EQ(APIResponse(nullptr).GetStatus(), 200);
}

TEST(ResponseStatus, IsSentAsTheNumberAloneAndTheMessageKept) {
  APIResponse response(nullptr);
  EXPECT_TRUE(response.SetStatus(HTTP_STATUS_NOT_FOUND, "gone away"));
  EXPECT_EQ(response.GetStatus(), 404);
  EXPECT_EQ(response.GetHeader("Status", ""), "404");
  EXPECT_EQ(response.Serialize()["option"]["statusMsg"], Json::Value("gone away"));
}

TEST(ResponseStatus, IsReadFromTheFrontOfTheHeader) {
  APIResponse response(nullptr);
  response.SetHeader("Status", "503 Service Unavailable");
  EXPECT_EQ(response.GetStatus(), 503);
}

TEST(ResponseStatus, IsADecimalNumberAfterBlanksAndASign) {
  APIResponse response(nullptr);
  for (const char* text : {" 404", "+404", "\t +404 Gone", "0404"}) {
    response.SetHeader("Status", text);
    EXPECT_EQ(response.GetStatus(), 404) << text;
  }
}

TEST(ResponseStatus, IsZeroWithoutDigitsAndOutOfRange) {
  APIResponse response(nullptr);
  for (const char* text : {"", "OK", "+", "4294967496", "99999999999999999999"}) {
    response.SetHeader("Status", text);
    EXPECT_EQ(response.GetStatus(), 0) << text;
  }
}

TEST(ResponseStatus, IsRefusedWhenTheHeaderCannotBeStored) {
  APIResponse response(nullptr);
  Json::Value record = json(R"({"option":{}})");
  response.Deserialize(record);
  EXPECT_FALSE(response.SetStatus(HTTP_STATUS_NOT_FOUND, "gone"));
  EXPECT_EQ(response.Serialize(), json(R"({"option":{}})"));
}

TEST(ResponseStatus, IsRefusedWhenItsMessageAloneCannotBeStored) {
  APIResponse response(nullptr);
  for (const char* text : {R"({"headers":{}})", R"({"headers":{},"option":"text"})",
                           R"({"headers":{},"option":[]})"}) {
    Json::Value record = json(text);
    response.Deserialize(record);
    EXPECT_FALSE(response.SetStatus(HTTP_STATUS_NOT_FOUND, "gone")) << text;
    EXPECT_EQ(response.GetHeader("Status", ""), "404") << text;
  }
}

TEST(ResponseRedirect, NamesTheHostThatTheClientCalledAndSetsTheStatus) {
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas:5001","HTTPS":"on"})");
  APIResponse response(&request);
  EXPECT_TRUE(response.Redirect("x"));
  EXPECT_EQ(response.GetHeader("Location", ""), "https://nas:5001/x");
  EXPECT_EQ(response.GetHeader("Status", ""), "302");
  EXPECT_EQ(response.Serialize()["option"]["statusMsg"], Json::Value(""));
}

TEST(ResponseRedirect, KeepsALeadingSlash) {
  APIRequest request = requestWithEnv(R"({"HTTP_HOST":"nas"})");
  APIResponse response(&request);
  EXPECT_TRUE(response.Redirect("/a/b?c"));
  EXPECT_EQ(response.GetHeader("Location", ""), "http://nas/a/b?c");
}

TEST(ResponseRedirect, HasAnEmptyHostWhenTheClientNamedNone) {
  APIRequest request;
  APIResponse response(&request);
  EXPECT_TRUE(response.Redirect("/a"));
  EXPECT_EQ(response.GetHeader("Location", ""), "http:///a");
}

TEST(ResponseRedirect, FailsWithoutARequest) {
  APIResponse response(nullptr);
  EXPECT_FALSE(response.Redirect("/a"));
  EXPECT_FALSE(response.Redirect(""));
  EXPECT_FALSE(response.HasHeader("Location"));
  EXPECT_FALSE(response.HasHeader("Status"));
}

TEST(ResponseRedirect, ThrowsOnAnEmptyPath) {
  APIRequest request;
  APIResponse response(&request);
  EXPECT_THROW(response.Redirect(""), std::out_of_range);
  EXPECT_FALSE(response.HasHeader("Location"));
}

TEST(ResponseOptions, PrintUnlessTheMethodPrintedItself) {
  APIResponse response(nullptr);
  EXPECT_TRUE(response.IsEnableOutput());
  EXPECT_TRUE(response.SetEnableOutput(false));
  EXPECT_FALSE(response.IsEnableOutput());
  EXPECT_EQ(response.Serialize()["option"]["isDownload"], Json::Value(false));
  response.SetEnableOutput(true);
  EXPECT_TRUE(response.IsEnableOutput());
}

TEST(ResponseOptions, RestartTheServerOnlyWhenAsked) {
  APIResponse response(nullptr);
  EXPECT_FALSE(response.GetHttpdRestart());
  EXPECT_TRUE(response.SetHttpdRestart(true));
  EXPECT_TRUE(response.GetHttpdRestart());
  EXPECT_EQ(response.Serialize()["option"]["restart_httpd"], Json::Value(true));
}

TEST(ResponseServerError, IsAHeader) {
  APIResponse response(nullptr);
  EXPECT_FALSE(response.HasServerError());
  EXPECT_EQ(response.GetServerError(), "");
  response.SetServerError("timeout");
  EXPECT_TRUE(response.HasServerError());
  EXPECT_EQ(response.GetServerError(), "timeout");
  EXPECT_EQ(response.GetHeader("x-request-error", ""), "timeout");
}

TEST_F(ResponseCallbacks, AreKeptInOrder) {
  response_.SetCallbackFunc(second, &argument_);
  response_.SetCallbackFunc(first, &argument_);
  const APIResponse::CallbackList expected{{second, &argument_}, {first, &argument_}};
  EXPECT_EQ(*response_.GetCallbackFuncs(), expected);
}

TEST_F(ResponseCallbacks, AreKeptOncePerFunctionAndArgument) {
  response_.SetCallbackFunc(first, &argument_);
  response_.SetCallbackFunc(first, &argument_);
  EXPECT_EQ(count(), 1u);
  response_.SetCallbackFunc(first, &other_);
  response_.SetCallbackFunc(second, &argument_);
  EXPECT_EQ(count(), 3u);
}

TEST_F(ResponseCallbacks, IgnoreANullFunction) {
  response_.SetCallbackFunc(nullptr, &argument_);
  EXPECT_EQ(count(), 0u);
}

TEST_F(ResponseCallbacks, AreRefusedInTheDaemonWithALogLine) {
  setenv("in_qeloapid", "", 1);
  response_.SetCallbackFunc(first, &argument_);
  EXPECT_EQ(count(), 0u);
  ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
  EXPECT_EQ(lineAsN(SyslogCapture::Messages()[0].text),
            "APIResponse.cpp:N cannot use callback function in qeloapid");
}

TEST_F(ResponseCallbacks, LogTheRefusalInTheDaemonAlsoForANullFunction) {
  setenv("in_qeloapid", "", 1);
  response_.SetCallbackFunc(nullptr, &argument_);
  EXPECT_EQ(SyslogCapture::Messages().size(), 1u);
}

TEST_F(ResponseCallbacks, AreTakenFromAListInItsOrder) {
  APIResponse::CallbackList list{
      {second, nullptr}, {nullptr, nullptr}, {first, nullptr}, {second, nullptr}};
  response_.SetCallbackFuncs(&list);
  const APIResponse::CallbackList expected{{second, nullptr}, {first, nullptr}};
  EXPECT_EQ(*response_.GetCallbackFuncs(), expected);
  response_.SetCallbackFuncs(nullptr);
  EXPECT_EQ(count(), 2u);
}

TEST(ResponseTransport, DeserializeGivesTheOldStateBackAndTakesTheNew) {
  APIResponse response(nullptr);
  response.SetError(105);
  APIResponse other(nullptr);
  other.SetSuccess("data");
  other.SetHeader("X-Test", "value");
  other.AddCookie("id", "x");
  Json::Value record = other.Serialize();
  response.Deserialize(record);
  EXPECT_EQ(body(response), body(other));
  EXPECT_EQ(response.GetError(), 0);
  EXPECT_EQ(response.GetHeaders(), other.GetHeaders());
  EXPECT_EQ(response.GetCookies(), other.GetCookies());
  EXPECT_EQ(record["code"], Json::Value(105));
}
