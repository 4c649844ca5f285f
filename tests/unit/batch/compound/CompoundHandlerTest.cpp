// The compound request as a whole: its parameters, where entries run, what each shows of itself
// and how they make the outer answer.

#include <dlfcn.h>
#include <syslog.h>

#include <algorithm>
#include <iostream>

#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

class Compound : public CompoundTest {};

TEST_F(Compound, NoEntriesGiveAnEmptyResult) {
  for (const char* more : {"{}", kParallel}) {
    RunCompound(Json::Value(Json::arrayValue), more);
    EXPECT_TRUE(succeeded);
    EXPECT_EQ(response->GetBody(),
              Parse(R"({"success": true, "data": {"has_fail": false, "result": []}})"));
  }
}

TEST_F(Compound, ListThatIsMissingOrNoArrayIs110) {
  for (const char* compound : {"null", "{}", R"("[]")", "5"}) {
    RunCompound(Parse(compound));
    EXPECT_FALSE(succeeded);
    EXPECT_EQ(response->GetBody(),
              Parse(R"({"success": false, "error": {"code": 110, "errors": ""}})"));
  }
  MakeRequest("QELO.Entry.Request", 1, "request");
  EXPECT_FALSE(CompoundHandler(request.get(), response.get(), runner.get()).Process());
  EXPECT_EQ(response->GetError(), 110);
  EXPECT_EQ(SyslogCapture::Count("CompoundHandler.cpp:"), 5);
  EXPECT_EQ(SyslogCapture::Count("ParseParams failed"), 5);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
}

TEST_F(Compound, ResultIsTheBodyWithTheCallInBothModesAndPlaces) {
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result =
        RunCompound(List({Entry("echo", 1, R"({"a": [1, "ä"]})"), Entry("silent", 2)}), more);
    ASSERT_EQ(result.size(), 2u);
    EXPECT_EQ(result[0], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "echo",
      "success": true, "data": {"api": "QELO.Test.Entries", "version": 1, "method": "echo",
      "a": [1, "ä"]}})"));
    EXPECT_EQ(result[1], Parse(R"({"api": "QELO.Test.Entries", "version": 2, "method": "silent",
      "success": false, "error": {"code": 117}})"));
    EXPECT_TRUE(HasFail());
    EXPECT_TRUE(succeeded);
  }
}

TEST_F(Compound, EntryThatNamesACallInAnUnusableWayIs101) {
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result = RunCompound(
        List({Parse(R"({"api": "", "version": 1, "method": "echo"})"),
              Parse(R"({"api": "QELO.Test.Entries", "version": 0, "method": "echo"})")}),
        more);
    ASSERT_EQ(result.size(), 2u);
    for (const Json::Value& entry : result) {
      EXPECT_EQ(entry, Parse(R"({"success": false, "error": {"code": 101}})"));
    }
  }
}

TEST_F(Compound, UnknownAPIVersionAndMethodHaveTheirOwnErrors) {
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result =
        RunCompound(List({Entry("echo", 1, "{}", "QELO.Test.Unknown"), Entry("echo", 3),
                          Entry("unknown"), Entry("echo")}),
                    more);
    EXPECT_EQ(Code(result[0]), 102);
    EXPECT_EQ(Code(result[1]), 104);
    EXPECT_EQ(Code(result[2]), 103);
    EXPECT_EQ(Code(result[3]), 0);
  }
}

// Where entries run

TEST_F(Compound, GrantableEntryRunsInProcessAndOthersInAChild) {
  const Json::Value result = RunCompound(List({Entry("process", 1), Entry("process", 2)}));
  EXPECT_NE(result[0]["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(result[1]["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(std::count(platform->calls.begin(), platform->calls.end(), "QLIBCProcForkEx(65)"), 1);
}

TEST_F(Compound, EntryGrantedByDefaultRunsInProcess) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  WriteDescription(Listing("entries", {"process"}, R"({"1": {"grantByDefault": true}})"),
                   "QELO.Test.Entries");
  const Json::Value result = RunCompound(List({Entry("process", 1)}));
  EXPECT_EQ(result[0]["data"]["pid"].asInt(), getpid());
}

TEST_F(Compound, ParallelEntriesAllRunInChildren) {
  const Json::Value result =
      RunCompound(List({Entry("process", 1), Entry("process", 2), Entry("process", 2)}), kParallel);
  EXPECT_NE(result[0]["data"]["pid"].asInt(), getpid());
  EXPECT_NE(result[1]["data"]["pid"].asInt(), getpid());
  EXPECT_NE(result[1]["data"]["pid"], result[2]["data"]["pid"]);
}

TEST_F(Compound, ModeInOtherLetterCaseRunsSequentially) {
  for (const char* mode : {"Parallel", "PARALLEL", "parallel ", "", "other"}) {
    Json::Value more;
    more["mode"] = mode;
    const Json::Value result = RunCompound(List({Entry("process", 2)}), JsonHelper::toString(more));
    EXPECT_EQ(result[0]["data"]["pid"].asInt(), getpid()) << mode;
  }
  const Json::Value result = RunCompound(List({Entry("process", 2)}), R"({"mode": ["parallel"]})");
  EXPECT_EQ(result[0]["data"]["pid"].asInt(), getpid());
}

TEST_F(Compound, ParallelEntriesOverlapAndKeepTheirOrder) {
  const double start = Seconds();
  const Json::Value result =
      RunCompound(List({Entry("slow", 1, R"({"ms": 300})"), Entry("slow", 1, R"({"ms": 200})"),
                        Entry("echo", 1, R"({"last": true})")}),
                  kParallel);
  EXPECT_LT(Seconds() - start, 0.45);
  EXPECT_EQ(result[0]["method"], Json::Value("slow"));
  EXPECT_EQ(result[1]["method"], Json::Value("slow"));
  EXPECT_EQ(result[2]["data"]["last"], Json::Value(true));
}

TEST_F(Compound, SequentialEntriesRunOneAfterTheOther) {
  const double start = Seconds();
  RunCompound(List({Entry("slow", 1, R"({"ms": 100})"), Entry("slow", 2, R"({"ms": 100})")}));
  EXPECT_GE(Seconds() - start, 0.2);
}

// What stops the others

TEST_F(Compound, StopWhenErrorListsAllLaterEntriesWith112) {
  for (const int failing : {1, 2}) {
    const Json::Value result = RunCompound(
        List({Entry("echo"), Entry("fail", failing), Entry("echo"), Entry("echo", 2)}), kStop);
    EXPECT_EQ(Code(result[0]), 0);
    EXPECT_EQ(Code(result[1]), 400);
    EXPECT_EQ(result[2], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "echo",
      "success": false, "error": {"code": 112}})"));
    EXPECT_EQ(Code(result[3]), 112);
    EXPECT_TRUE(HasFail());
    EXPECT_TRUE(succeeded);
  }
}

TEST_F(Compound, WithoutStopWhenErrorAllEntriesRun) {
  for (const char* more :
       {"{}", R"({"stop_when_error": false})", R"({"stop_when_error": "yes"})"}) {
    const Json::Value result = RunCompound(List({Entry("fail", 2), Entry("echo", 2)}), more);
    EXPECT_EQ(Code(result[0]), 400);
    EXPECT_EQ(Code(result[1]), 0);
    EXPECT_TRUE(HasFail());
  }
}

TEST_F(Compound, StopWhenErrorIsIgnoredInParallel) {
  const Json::Value result = RunCompound(List({Entry("upload"), Entry("fail"), Entry("echo")}),
                                         R"({"mode": "parallel", "stop_when_error": true})");
  EXPECT_EQ(Code(result[1]), 400);
  EXPECT_EQ(Code(result[2]), 0);
}

TEST_F(Compound, UploadAndDownloadMethodsAre113AndTheOthersRun) {
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result = RunCompound(
        List({Entry("echo"), Entry("upload"), Entry("download", 2), Entry("echo", 2)}), more);
    EXPECT_EQ(Code(result[0]), 0);
    EXPECT_EQ(result[1], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "upload",
      "success": false, "error": {"code": 113}})"));
    EXPECT_EQ(Code(result[2]), 113);
    EXPECT_EQ(Code(result[3]), 0);
    EXPECT_TRUE(HasFail());
  }
}

TEST_F(Compound, DefaultsForbidNoMethodWhoseAttributesAreNoObject) {
  WriteLibDef(R"({"methods": {"allowDownload": true}})");
  Json::Value description = Listing("entries", {"echo"}, R"({"1": null})");
  description["methods"]["1"].append("process");
  WriteDescription(description, "QELO.Test.Entries");
  const Json::Value result = RunCompound(List({Entry("echo"), Entry("process")}));
  EXPECT_EQ(Code(result[0]), 0);
  EXPECT_EQ(Code(result[1]), 113);  // listed as a text, it has the defaults
}

TEST_F(Compound, RefusedTransferStopsTheOthers) {
  const Json::Value result = RunCompound(List({Entry("upload"), Entry("echo")}), kStop);
  EXPECT_EQ(Code(result[1]), 112);
}

// What entries share

TEST_F(Compound, EntryHasTheOuterEnvironmentAsAPostWithoutQuery) {
  for (const int version : {1, 2}) {
    Prepare(List({Entry("process", version)}));
    request->InitEnv(Parse(R"({"REQUEST_METHOD": "GET", "QUERY_STRING": "api=x"})"));
    request->InitSession(Parse(R"({"username": "alice"})"));
    CompoundHandler(request.get(), response.get(), runner.get()).Process();
    const Json::Value data = Data()["result"][0]["data"];
    EXPECT_EQ(data["requestMethod"], Json::Value("POST"));
    EXPECT_EQ(data["hasQuery"], Json::Value(false));
    EXPECT_EQ(data["user"], Json::Value("alice"));
    EXPECT_EQ(request->GetEnv("REQUEST_METHOD"), Json::Value("GET"));
    EXPECT_TRUE(request->HasEnv("QUERY_STRING"));
  }
}

TEST_F(Compound, ParametersOfAnotherEntryAreGone) {
  const Json::Value result =
      RunCompound(List({Entry("echo", 2, R"({"a": 1})"), Entry("echo", 2, R"({"b": 2})")}));
  EXPECT_FALSE(result[0]["data"].isMember("compound"));
  EXPECT_FALSE(result[1]["data"].isMember("a"));
}

TEST_F(Compound, EntryWithoutAnAnswerDoesNotShowTheOneBefore) {
  for (const int version : {1, 2}) {
    const Json::Value result = RunCompound(List({Entry("echo", 2), Entry("refused", version)}));
    EXPECT_EQ(Code(result[0]), 0);
    EXPECT_EQ(Code(result[1]), 117);
    EXPECT_TRUE(HasFail());
  }
}

TEST_F(Compound, ServerErrorOfTheLastFailingEntryIsTheOuterOne) {
  for (const char* more : {"{}", kParallel}) {
    for (const int version : {1, 2}) {
      RunCompound(List({Entry("fail", version, R"({"word": "noprivilege"})"),
                        Entry("fail", version, R"({"word": "timeout"})")}),
                  more);
      EXPECT_EQ(response->GetServerError(), "timeout");
    }
  }
  RunCompound(List({Entry("fail"), Entry("echo", 2)}));
  EXPECT_FALSE(response->HasServerError());
}

TEST_F(Compound, RestartAskedByAnyEntryIsTheOuterOne) {
  for (const char* more : {"{}", kParallel}) {
    for (const int version : {1, 2}) {
      RunCompound(List({Entry("echo"), Entry("restart", version), Entry("echo")}), more);
      EXPECT_TRUE(response->GetHttpdRestart());
      EXPECT_FALSE(HasFail());
    }
    RunCompound(List({Entry("echo")}), more);
    EXPECT_FALSE(response->GetHttpdRestart());
  }
}

TEST_F(Compound, InnerStateIsNotSent) {
  const Json::Value result = RunCompound(List({Entry("fail", 1, R"({"word": "timeout"})")}));
  EXPECT_FALSE(result[0].isMember("info"));
  EXPECT_EQ(Data().getMemberNames(), (std::vector<std::string>{"has_fail", "result"}));
}

// Nested requests

TEST_F(Compound, NestedRequestAnswersItsOwnResults) {
  Json::Value inner = Entry("request", 1, "{}", "QELO.Entry.Request");
  inner["compound"] = List({Entry("echo", 1, R"({"deep": 1})"), Entry("fail", 2)});
  for (const char* mode : {"sequential", "parallel"}) {
    inner["mode"] = mode;
    for (const char* more : {"{}", kParallel}) {
      const Json::Value result = RunCompound(List({inner, Entry("echo", 2)}), more);
      EXPECT_EQ(Code(result[0]), 0);
      EXPECT_EQ(result[0]["data"]["has_fail"], Json::Value(true));
      EXPECT_EQ(result[0]["data"]["result"][0]["data"]["deep"], Json::Value(1));
      EXPECT_EQ(Code(result[0]["data"]["result"][1]), 400);
      EXPECT_EQ(Code(result[1]), 0);
      EXPECT_FALSE(HasFail());  // the inner request itself succeeded
    }
  }
}

TEST_F(Compound, NestedRequestInProcessAnswersItsOwnResults) {
  Json::Value entry = Parse(R"({"lib": "", "minVersion": 1, "maxVersion": 1})");
  entry["methods"]["1"][0]["request"]["grantable"] = true;
  WriteDescription(entry, "QELO.Entry.Request");
  Json::Value inner = Entry("request", 1, "{}", "QELO.Entry.Request");
  inner["compound"] = List({Entry("process", 2), Entry("fail", 2)});
  const Json::Value result = RunCompound(List({inner, Entry("process", 2)}));
  EXPECT_EQ(result[0]["data"]["result"][0]["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(Code(result[0]["data"]["result"][1]), 400);
  EXPECT_EQ(Code(result[1]), 0);
}

TEST_F(Compound, NestedRequestWithoutAListIs110) {
  const Json::Value result =
      RunCompound(List({Entry("request", 1, "{}", "QELO.Entry.Request"), Entry("echo")}));
  EXPECT_EQ(Code(result[0]), 110);
  EXPECT_EQ(Code(result[1]), 0);
}

TEST_F(Compound, RunnerSendsARequestToTheHandler) {
  Prepare(List({Entry("echo"), Entry("fail", 2)}));
  EXPECT_TRUE(runner->Process(request.get(), response.get()));
  EXPECT_EQ(Data()["result"].size(), 2u);
  EXPECT_TRUE(HasFail());
}

// Loading ahead

TEST_F(Compound, SequentialRequestLoadsAllLibrariesBeforeItsFirstEntry) {
  // The libraries of later entries are gone by the time that they run.
  std::filesystem::copy_file(std::string(TEST_PLUGIN_DIR) + "/state.so", directory / "copy.so");
  Json::Value description = Listing("state", {"run"}, R"({"1": {"grantable": true}})");
  description["lib"] = (directory / "copy.so").string();
  WriteDescription(description, "QELO.Test.Call");
  Json::Value inner = Entry("request", 1, "{}", "QELO.Entry.Request");
  inner["compound"] = List({Entry("run", 1, "{}", "QELO.Test.Call")});
  struct Removing : TestRunner {
    bool NeedPermission(APIRequest* request) override {
      std::filesystem::remove(file);
      return TestRunner::NeedPermission(request);
    }
    std::filesystem::path file;
  };
  for (const Json::Value& entry : {Entry("run", 1, "{}", "QELO.Test.Call"), inner}) {
    auto removing = std::make_unique<Removing>();
    removing->file = directory / "copy.so";
    runner = std::move(removing);
    const Json::Value result = RunCompound(List({Entry("echo", 2), entry}));
    EXPECT_EQ(Code(result[1]), 0) << JsonHelper::toString(result);
    EXPECT_FALSE(std::filesystem::exists(directory / "copy.so"));
    std::filesystem::copy_file(std::string(TEST_PLUGIN_DIR) + "/state.so", directory / "copy.so");
  }
}

TEST_F(Compound, ParallelRequestLoadsNothingAhead) {
  const std::string file = directory / "copy.so";
  std::filesystem::copy_file(std::string(TEST_PLUGIN_DIR) + "/entries.so", file);
  Json::Value description = Listing("entries", {"echo"}, R"({"1": {}})");
  description["lib"] = file;
  WriteDescription(description, "QELO.Test.Entries");
  for (const char* more : {kParallel, "{}"}) {
    EXPECT_EQ(Code(RunCompound(List({Entry("echo")}), more)[0]), 0);
    void* loaded = dlopen(file.c_str(), RTLD_LAZY | RTLD_NOLOAD);
    EXPECT_EQ(loaded != nullptr, more != kParallel);
    if (loaded != nullptr) {
      dlclose(loaded);
    }
  }
}

TEST_F(Compound, LoadingAheadOfALibraryThatIsMissingCostsOnlyItsOwnEntry) {
  WriteDescription(Listing("no_such_library", {"run"}, R"({"1": {}})"), "QELO.Test.Call");
  const Json::Value result =
      RunCompound(List({Entry("run", 1, "{}", "QELO.Test.Call"), Entry("echo"), Json::Value(5)}));
  EXPECT_EQ(Code(result[0]), 111);
  EXPECT_EQ(Code(result[1]), 0);
}

TEST_F(Compound, WhatALibraryPrintsWhenItIsLoadedGoesNowhere) {
  WriteDescription(Listing("printing", {"run"}, R"({"1": {}})"), "QELO.Test.Call");
  const int output = memfd_create("output", MFD_CLOEXEC);
  fflush(stdout);
  const int former = dup(STDOUT_FILENO);
  dup2(output, STDOUT_FILENO);
  RunCompound(List({Entry("run", 1, "{}", "QELO.Test.Call")}));
  std::cout.flush();
  fflush(stdout);
  EXPECT_EQ(lseek(output, 0, SEEK_END), 0);
  runner.reset();  // what it prints when it is closed is not asked here
  std::cout.flush();
  fflush(stdout);
  dup2(former, STDOUT_FILENO);
  close(former);
  close(output);
}

}  // namespace
}  // namespace QELO
