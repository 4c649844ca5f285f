// The check of declared parameters, on the roads of a call.

#include "webapi/runner/execution/ParamCheck.h"

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class SocketRunner : public TestRunner {
 public:
  using APIRunner::ProcessSocket;
};

class ParameterCheck : public RunnerTest {
 protected:
  bool Passes(const std::string& attributes, const std::string& params) {
    MakeRequest("QELO.Test.Call", 1, "run", Parse(params));
    return ParamCheck::Passes(*request, *response, Parse(attributes));
  }
};

TEST_F(ParameterCheck, NothingDeclaredPassesAndAsksNobody) {
  for (const char* attributes : {"{}", "null", "[]", R"({"allowDemo": true})"}) {
    EXPECT_TRUE(Passes(attributes, R"({"a": 1})"));
  }
  EXPECT_EQ(platform->calls, std::vector<std::string>());
}

TEST_F(ParameterCheck, WhatDoesNotFitIs101WithTheFields) {
  EXPECT_FALSE(Passes(R"({"params": {"properties": {"a": {"type": "string"}}, "required": ["b"]}})",
                      R"({"a": 5})"));
  EXPECT_EQ(response->GetBody(), Parse(R"({"success": false, "error": {"code": 101, "errors": [
      {"path": "/b", "rule": "required", "message": "is missing"},
      {"path": "/a", "rule": "type", "message": "must be of the type \"string\""}]}})"));
}

TEST_F(ParameterCheck, JsonStaysAsItCameWithoutTexts) {
  EXPECT_TRUE(Passes(R"({"params": {"properties": {"a": {"type": "string"}}}})", R"({"a": "5"})"));
  EXPECT_EQ(request->GetParam("a"), Json::Value("5"));
}

TEST_F(ParameterCheck, ATextThatIsNotTheParametersOwnDoesNotCount) {
  MakeRequest("QELO.Test.Call", 1, "run", Parse(R"({"a": "x", "b": 5})"));
  request->KeepSentLine("a=y&b=6");
  EXPECT_FALSE(ParamCheck::Passes(
      *request, *response,
      Parse(R"({"params": {"properties": {"a": {"type": "string"}, "b": {"type": "string"}}}})")));
  EXPECT_EQ(request->GetParam("a"), Json::Value("x"));
  EXPECT_EQ(request->GetParam("b"), Json::Value(5));
}

TEST_F(ParameterCheck, DeclaredNamesOfTheFrameworkAreChecked) {
  const char* attributes = R"({"params": {"properties": {"client_time": {"type": "integer"}},
                                          "additionalProperties": false}})";
  EXPECT_TRUE(Passes(attributes, R"({"client_time": 5, "_x": 1})"));
  EXPECT_EQ(request->GetParam("_x"), Json::Value(1));
  EXPECT_FALSE(Passes(attributes, R"({"client_time": "x"})"));
}

TEST_F(ParameterCheck, ASchemaThatIsNoneIs103AndLogged) {
  EXPECT_FALSE(Passes(R"({"params": {"properties": {"a": {"minimum": "x"}}}})", "{}"));
  EXPECT_EQ(response->GetError(), 103);
  EXPECT_EQ(SyslogCapture::Count("description QELO.Test.Call: params of run are no schema: "
                                 "/properties/a/minimum: must be a number"),
            1);
  for (const char* params : {"true", "null", "5", R"({"type": "array"})", R"({"$ref": "#"})"}) {
    SyslogCapture::Clear();
    EXPECT_FALSE(Passes(std::string(R"({"params": )") + params + "}", "{}")) << params;
    EXPECT_EQ(response->GetError(), 103) << params;
    EXPECT_EQ(SyslogCapture::Count("are no schema"), 1) << params;
  }
}

TEST_F(ParameterCheck, WithoutAReaderOfSchemasIs117) {
  platform->readsSchemas = false;
  EXPECT_FALSE(Passes(R"({"params": {}})", "{}"));
  EXPECT_EQ(response->GetError(), 117);
}

TEST_F(ParameterCheck, ARefusedCallRunsNothing) {
  EXPECT_FALSE(ProcessPlugin("no_such_library", R"({"params": {"required": ["a"]}})"));
  EXPECT_EQ(response->GetError(), 101) << "the library was not looked for";
  EXPECT_TRUE(ProcessPlugin("state", R"({"params": {}})"));
}

TEST_F(ParameterCheck, StandsBeforeADaemonToo) {
  Json::Value description = Description("state", R"({"params": {"required": ["a"]}})");
  description["socket"] = "daemon.sock";
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  SocketRunner tested;
  ASSERT_TRUE(tested.CheckRequestParam(request.get(), response.get()));
  tested.AddAPIInfo(request.get());
  platform->calls.clear();
  EXPECT_FALSE(tested.ProcessSocket(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 101);
  EXPECT_EQ(platform->calls, std::vector<std::string>{"Schema::Apply"}) << "nothing was connected";
}

TEST_F(ParameterCheck, TextsAreForgottenBeforeTheMethodRuns) {
  for (const char* attributes : {"{}", R"({"params": {}})"}) {
    MakeRequest("QELO.Test.Call", 1, "run");
    request->KeepSentLine("a=1");
    EXPECT_TRUE(ParamCheck::Passes(*request, *response, Parse(attributes)));
    EXPECT_EQ(request->GetSentTexts(), Parse("{}"));
  }
}

TEST_F(ParameterCheck, CopiesAndReplacedParametersHaveNoTexts) {
  MakeRequest("QELO.Test.Call", 1, "run");
  request->KeepSentLine("a=1&b=%5B");
  request->KeepSentLine("a=2");
  request->KeepSentLine("c=3");
  EXPECT_EQ(request->GetSentTexts(), Parse(R"({"a": "2", "b": "[", "c": "3"})"));
  EXPECT_EQ(APIRequest(*request).GetSentTexts(), Parse("{}"));
  request->InitParam(Parse(R"({"postParam": {}})"), true);
  EXPECT_EQ(request->GetSentTexts(), Parse("{}"));
}

}  // namespace
}  // namespace QELO
