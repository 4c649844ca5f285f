#include <gtest/gtest.h>

#include "webapi/ExecParam.h"
#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

Json::Value parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
  return value;
}

TEST(ExecParamRecord, FreshOneHasEmptySectionsAndTheDefaults) {
  ExecParam param;
  EXPECT_EQ(param.Serialize(),
            parse(R"({"params": {}, "env": {}, "attr": {}, "runner": {}, "output": {}})"));
  EXPECT_EQ(param.GetAPI(), "");
  EXPECT_EQ(param.GetVersion(), 0);
  EXPECT_EQ(param.GetMethod(), "");
  EXPECT_EQ(param.GetParams(), Json::Value(Json::objectValue));
  EXPECT_EQ(param.GetEnv(), Json::Value(Json::objectValue));
  EXPECT_EQ(param.GetAttr(), Json::Value(Json::objectValue));
  EXPECT_EQ(param.GetRunner(), "");
  EXPECT_EQ(param.GetOutputFd(), -1);
}

TEST(ExecParamRecord, SettersChainAndGettersReadThemBack) {
  ExecParam param;
  ExecParam& last = param.SetAPI("QELO.A.B")
                        .SetVersion(2)
                        .SetMethod("get")
                        .SetParams(parse(R"({"x": [1]})"))
                        .SetEnv(parse(R"({"HTTP_HOST": "h"})"))
                        .SetAttr(parse(R"({"a": true})"))
                        .SetRunner("alice")
                        .SetOutputFd(7);
  EXPECT_EQ(&last, &param);
  EXPECT_EQ(param.GetAPI(), "QELO.A.B");
  EXPECT_EQ(param.GetVersion(), 2);
  EXPECT_EQ(param.GetMethod(), "get");
  EXPECT_EQ(param.GetParams(),
            parse(R"({"api": "QELO.A.B", "version": 2, "method": "get", "x": [1]})"));
  EXPECT_EQ(param.GetEnv(), parse(R"({"HTTP_HOST": "h"})"));
  EXPECT_EQ(param.GetAttr(), parse(R"({"a": true})"));
  EXPECT_EQ(param.GetRunner(), "alice");
  EXPECT_EQ(param.GetOutputFd(), 7);
  EXPECT_EQ(param.Serialize(), parse(R"({
    "params": {"api": "QELO.A.B", "version": 2, "method": "get", "x": [1]},
    "env": {"HTTP_HOST": "h"}, "attr": {"a": true},
    "runner": {"username": "alice"}, "output": {"fd": 7}})"));
}

TEST(ExecParamRecord, ParamsAreMergedAndTheLastSetterWins) {
  ExecParam param;
  param.SetAPI("QELO.A.B").SetParams(parse(R"({"x": 1, "y": 1, "method": "from params"})"));
  param.SetParams(parse(R"({"y": 2})"));
  EXPECT_EQ(param.GetAPI(), "QELO.A.B");
  EXPECT_EQ(param.GetMethod(), "from params");
  EXPECT_EQ(param.GetParams()["x"], Json::Value(1));
  EXPECT_EQ(param.GetParams()["y"], Json::Value(2));
}

TEST(ExecParamRecord, WhatIsNoObjectChangesNothing) {
  ExecParam param;
  param.SetParams(parse(R"({"x": 1})"));
  for (const char* text : {"null", "5", "[1]", "\"x\"", "{}"}) {
    param.SetParams(parse(text)).SetEnv(parse(text)).SetAttr(parse(text));
  }
  EXPECT_EQ(param.Serialize(), parse(R"({"params": {"x": 1}, "env": {}, "attr": {}, "runner": {},
                                         "output": {}})"));
}

TEST(ExecParamRecord, CopyIsItsOwn) {
  ExecParam param;
  param.SetAPI("QELO.A.B");
  ExecParam copy(param);
  ExecParam assigned;
  assigned.SetMethod("old");
  assigned = param;
  param.SetAPI("QELO.C.D");
  EXPECT_EQ(copy.GetAPI(), "QELO.A.B");
  EXPECT_EQ(assigned.GetAPI(), "QELO.A.B");
  EXPECT_EQ(assigned.GetMethod(), "");
}

TEST(ExecParamRecord, TravelsAsJson) {
  ExecParam param;
  param.SetAPI("QELO.A.B").SetVersion(3).SetRunner("bob").SetEnv(parse(R"({"A": "1"})"));
  const std::string text = JsonHelper::toString(param.Serialize());
  ExecParam built(parse(text));
  EXPECT_EQ(built.Serialize(), param.Serialize());

  ExecParam taken;
  taken.SetMethod("former");
  Json::Value record = parse(text);
  taken.Deserialize(record);
  EXPECT_EQ(taken.Serialize(), param.Serialize());
  EXPECT_EQ(record["params"]["method"], Json::Value("former"));
}

TEST(ExecParamRecord, BuiltFromALackingRecordCanBeSet) {
  for (const char* text : {"null", "[]", "5", "{}", R"({"runner": {"username": "bob"}})"}) {
    ExecParam param(parse(text));
    param.SetAPI("QELO.A.B").SetOutputFd(3);
    EXPECT_EQ(param.GetAPI(), "QELO.A.B") << text;
    EXPECT_EQ(param.GetOutputFd(), 3) << text;
  }
}

TEST(ExecParamRecord, BrokenRecordReadsAsTheDefaults) {
  for (const char* text : {"5", "[]", R"({"params": 5, "runner": [], "output": "x"})",
                           R"({"params": {"api": [], "version": {}, "method": {}},
                               "runner": {"username": {}}, "output": {"fd": "x"}})"}) {
    ExecParam param;
    Json::Value record = parse(text);
    param.Deserialize(record);
    EXPECT_EQ(param.GetAPI(), "") << text;
    EXPECT_EQ(param.GetVersion(), 0) << text;
    EXPECT_EQ(param.GetMethod(), "") << text;
    EXPECT_EQ(param.GetRunner(), "") << text;
    EXPECT_EQ(param.GetOutputFd(), -1) << text;
  }
}

}  // namespace
}  // namespace QELO
