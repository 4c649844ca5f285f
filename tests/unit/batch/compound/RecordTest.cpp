// What the methods of entries leave in the records: what the next entry in the process finds, and
// what no record should hold.

#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

constexpr char kMangling[] = "QELO.Test.Mangling";

class CompoundRecord : public CompoundTest {
 protected:
  void SetUp() override {
    CompoundTest::SetUp();
    WriteDescription(Listing("mangling", {"body", "response", "call", "params", "request"},
                             R"({"1": {}, "2": {"grantable": true}})"),
                     kMangling);
  }

  static Json::Value Mangling(const char* method, int version, const char* value) {
    Json::Value entry = Entry(method, version, "{}", kMangling);
    entry["value"] = Parse(value);
    return entry;
  }

  /// What shows of an entry whose body is lost.
  static Json::Value Call(const char* method, int version) {
    return Entry(method, version, "{}", kMangling);
  }
};

// What the next entry finds

TEST_F(CompoundRecord, EntryFindsServerErrorHeaderAndRestartOfThoseBeforeIt) {
  for (const int version : {1, 2}) {
    const Json::Value result =
        RunCompound(List({Entry("found", version), Entry("fail", 2, R"({"word": "timeout"})"),
                          Entry("mark", 2), Entry("restart", 2), Entry("found", version)}));
    EXPECT_EQ(result[0]["data"], Parse(R"({"serverError": "", "mark": "", "restart": false})"));
    EXPECT_EQ(result[4]["data"],
              Parse(R"({"serverError": "timeout", "mark": "set", "restart": true})"));
    EXPECT_EQ(Code(result[4]), 0);
    EXPECT_EQ(response->GetServerError(), "timeout");
    EXPECT_TRUE(response->GetHttpdRestart());
  }
}

TEST_F(CompoundRecord, EntryFindsNothingOfWhatAChildSet) {
  for (const int version : {1, 2}) {
    const Json::Value result =
        RunCompound(List({Entry("fail", 1, R"({"word": "timeout"})"), Entry("mark"),
                          Entry("restart"), Entry("found", version)}));
    EXPECT_EQ(result[3]["data"], Parse(R"({"serverError": "", "mark": "", "restart": false})"));
  }
}

TEST_F(CompoundRecord, HeadersOfEntriesAreNotTheOuterOnes) {
  RunCompound(List({Entry("mark", 2), Entry("mark")}));
  EXPECT_FALSE(response->HasHeader("X-Mark"));
}

TEST_F(CompoundRecord, WhatAnEntryDoesNotNameIsAsTheOneBeforeItLeftIt) {
  for (const char* more : {"{}", kParallel}) {
    Json::Value compound = List({Entry("echo", 2, R"({"x": 1})")});
    for (const char* text : {"{}", "5", "null", "[]", R"("text")", R"({"a": 1})",
                             R"({"api": "QELO.Test.Entries", "method": "echo"})"}) {
      compound.append(Parse(text));
    }
    compound.append(Parse(R"({"method": "silent"})"));
    compound.append(Parse(R"({"version": 1, "method": "echo"})"));
    compound.append(Parse("{}"));
    const Json::Value result = RunCompound(compound, more);
    ASSERT_EQ(result.size(), 11u);
    for (unsigned i = 0; i < 8; ++i) {
      EXPECT_EQ(Code(result[i]), 0) << i;
      EXPECT_EQ(result[i]["version"], 2) << i;
      EXPECT_EQ(result[i]["data"].isMember("x"), i == 0) << "parameters are each entry's own";
    }
    EXPECT_EQ(Code(result[8]), 117) << "the silent method's";
    EXPECT_EQ(result[10]["version"], 1);
    EXPECT_EQ(result[10]["method"], "echo");
  }
}

TEST_F(CompoundRecord, FirstEntryThatNamesNothingIsAsTheOuterCall) {
  const Json::Value result = RunCompound(List({Parse("{}")}), kParallel);
  EXPECT_EQ(Code(result[0]), 110);
  EXPECT_EQ(result[0]["api"], "QELO.Entry.Request");
}

// What no record should hold

TEST_F(CompoundRecord, BodyThatIsNoObjectShowsTheCallAlone) {
  for (const char* more : {"{}", kParallel}) {
    for (const int version : {1, 2}) {
      for (const char* value : {"\"text\"", "[1, 2]", "5", "true", "null"}) {
        const Json::Value result =
            RunCompound(List({Mangling("body", version, value), Entry("echo", 2)}), more);
        EXPECT_EQ(result[0], Call("body", version)) << value;
        EXPECT_EQ(Code(result[1]), 0) << value;
        EXPECT_TRUE(succeeded);
      }
    }
  }
}

TEST_F(CompoundRecord, ResponseThatIsNoObjectShowsTheCallAlone) {
  for (const char* more : {"{}", kParallel}) {
    for (const int version : {1, 2}) {
      for (const char* value : {"\"text\"", "[1, 2]", "5", "null"}) {
        const Json::Value result =
            RunCompound(List({Mangling("response", version, value), Entry("echo", 2)}), more);
        EXPECT_EQ(result[0], Call("response", version)) << value;
        EXPECT_EQ(Code(result[1]), 0) << value;
      }
    }
  }
}

TEST_F(CompoundRecord, RequestThatCanTakeNoEntryIsMadeAnew) {
  for (const char* more : {"{}", kParallel}) {
    for (const int version : {1, 2}) {
      for (const char* method : {"call", "params", "request"}) {
        for (const char* value : {"\"text\"", "[1, 2]", "5", "null"}) {
          Prepare(List({Mangling(method, version, value), Entry("echo", 2, R"({"a": 1})"),
                        Entry("process", 2)}),
                  more);
          request->InitEnv(Parse(R"({"REQUEST_METHOD": "GET", "QUERY_STRING": "api=x"})"));
          request->InitSession(Parse(R"({"username": "alice"})"));
          CompoundHandler(request.get(), response.get(), runner.get()).Process();
          const Json::Value result = Data()["result"];
          ASSERT_EQ(result.size(), 3u) << method << value;
          EXPECT_EQ(Code(result[1]), 0) << method << value;
          EXPECT_EQ(result[1]["data"]["a"], Json::Value(1)) << method << value;
          EXPECT_FALSE(result[1]["data"].isMember("value")) << method << value;
          EXPECT_EQ(result[2]["data"]["requestMethod"], Json::Value("POST")) << method << value;
          EXPECT_EQ(result[2]["data"]["hasQuery"], Json::Value(false)) << method << value;
          EXPECT_EQ(result[2]["data"]["user"], Json::Value("alice")) << method << value;
        }
      }
    }
  }
}

// Deep answers

TEST_F(CompoundRecord, AnswerNestedTooDeepForAMessageIs117FromAChildAlone) {
  Json::Value entry = Entry("deep", 1, R"({"levels": 300})");
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result = RunCompound(List({entry, Entry("echo")}), more);
    EXPECT_EQ(result[0], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "deep",
      "success": false, "error": {"code": 117}})"));
    EXPECT_EQ(Code(result[1]), 0);
    EXPECT_TRUE(HasFail());
  }
  EXPECT_EQ(Logged("json nests deeper than 256"), 2);
  EXPECT_EQ(Logged("write json failed"), 2);
  EXPECT_EQ(Logged("read compound json failed"), 0);

  entry["version"] = 2;
  const Json::Value result = RunCompound(List({entry}));
  EXPECT_EQ(Code(result[0]), 0);
  EXPECT_FALSE(HasFail());
}

TEST_F(CompoundRecord, AnswerNestedAsDeepAsAMessageMayBeArrivesFromAChild) {
  // Message and result are two levels around the answer's data.
  const Json::Value result = RunCompound(
      List({Entry("deep", 1, R"({"levels": 254})"), Entry("deep", 1, R"({"levels": 255})")}));
  EXPECT_EQ(Code(result[0]), 0);
  EXPECT_EQ(Code(result[1]), 117);
}

}  // namespace
}  // namespace QELO
