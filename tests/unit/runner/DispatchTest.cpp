#include <sys/wait.h>

#include <chrono>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

using Clock = std::chrono::steady_clock;

class RequestCheck : public RunnerTest {
 protected:
  void SetUp() override {
    RunnerTest::SetUp();
    Json::Value description = Description("state");
    description["methods"] = Parse(R"({"1": ["plain", {"upload": {"allowUpload": true}},
                                             {"one": {}, "two": {}}],
                                       "2": "no list", "3": [7, null, "later"]})");
    WriteDescription(description);
  }
  /// Describes these versions; "run" is listed for 1 to 3 whatever they are.
  static void WriteVersions(int lowest, int highest) {
    Json::Value description = Description("state");
    description["minVersion"] = lowest;
    description["maxVersion"] = highest;
    WriteDescription(description);
  }
  int Check(const std::string& api, int version, const std::string& method) {
    MakeRequest(api, version, method);
    const bool passed = TestRunner().CheckRequestParam(request.get(), response.get());
    EXPECT_EQ(passed, response->GetError() == 0);
    return response->GetError();
  }
};

TEST_F(RequestCheck, BadNamesAndVersionsAre101) {
  EXPECT_EQ(Check("", 1, "plain"), 101);
  EXPECT_EQ(Check("QELO.Test.Call", 0, "plain"), 101);
  EXPECT_EQ(Check("QELO.Test.Call", -1, "plain"), 101);
  EXPECT_EQ(Check("QELO.Test.Call", 1, ""), 101);
}

TEST_F(RequestCheck, UnknownApiIs102) {
  EXPECT_EQ(Check("QELO.No.Such", 1, "plain"), 102);
  EXPECT_EQ(Check("QELO.Test.Call.Other", 1, "plain"), 102);  // its file exists, without it
}

TEST_F(RequestCheck, VersionBoundsAreInclusive) {
  EXPECT_EQ(Check("QELO.Test.Call", 1, "plain"), 0);
  EXPECT_EQ(Check("QELO.Test.Call", 3, "later"), 0);
  EXPECT_EQ(Check("QELO.Test.Call", 4, "plain"), 104);
}

TEST_F(RequestCheck, VersionBelowTheLowestIs104ThoughItsMethodsAreListed) {
  WriteVersions(3, 5);
  EXPECT_EQ(Check("QELO.Test.Call", 2, "run"), 104);
  EXPECT_EQ(Check("QELO.Test.Call", 3, "run"), 0);
}

TEST_F(RequestCheck, NoVersionPassesWhenTheLowestIsAboveTheHighest) {
  WriteVersions(3, 1);
  for (const int version : {1, 2, 3}) {
    EXPECT_EQ(Check("QELO.Test.Call", version, "run"), 104) << version;
  }
}

TEST_F(RequestCheck, MethodNotListedForTheVersionIs103) {
  EXPECT_EQ(Check("QELO.Test.Call", 1, "absent"), 103);
  EXPECT_EQ(Check("QELO.Test.Call", 2, "plain"), 103);
  EXPECT_EQ(Check("QELO.Test.Call", 3, "plain"), 103);
}

TEST_F(RequestCheck, VersionKeyMissingThoughInRangeIs103) {
  Json::Value description = Description("state");
  description["methods"].removeMember("2");
  WriteDescription(description);
  EXPECT_EQ(Check("QELO.Test.Call", 2, "run"), 103);
}

TEST_F(RequestCheck, AnyMemberOfAnObjectEntryIsListed) {
  EXPECT_EQ(Check("QELO.Test.Call", 1, "one"), 0);
  EXPECT_EQ(Check("QELO.Test.Call", 1, "two"), 0);
}

TEST_F(RequestCheck, UploadNeedsItsAttribute) {
  for (const auto& [method, code] : {std::pair("plain", 115), std::pair("upload", 0)}) {
    MakeRequest("QELO.Test.Call", 1, method);
    request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
    TestRunner().CheckRequestParam(request.get(), response.get());
    EXPECT_EQ(response->GetError(), code) << method;
  }
}

TEST_F(RequestCheck, AttributesThatAreNoObjectAllowNothingWhateverTheDefaults) {
  WriteLibDef(R"({"methods": {"allowUpload": true}})");
  Json::Value description = Description("state");
  description["methods"] = Parse(R"({"1": ["plain", {"odd": "text"}, {"none": null}]})");
  WriteDescription(description);
  for (const auto& [method, code] :
       {std::pair("plain", 0), std::pair("odd", 115), std::pair("none", 115)}) {
    MakeRequest("QELO.Test.Call", 1, method);
    request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
    TestRunner().CheckRequestParam(request.get(), response.get());
    EXPECT_EQ(response->GetError(), code) << method;
  }
}

class Dispatch : public RunnerTest {};

TEST_F(Dispatch, HooksOfTheBaseAreConstant) {
  APIRunner base;
  EXPECT_TRUE(base.CheckSharingPermission(nullptr, nullptr));
  EXPECT_FALSE(base.NeedPermission(nullptr));
  EXPECT_TRUE(base.CheckPermission(nullptr, nullptr));
  EXPECT_TRUE(base.SkipPermission(nullptr));
  EXPECT_TRUE(base.HandleUpload(nullptr, nullptr));
}

TEST_F(Dispatch, RunWithNullIs101) {
  TestRunner tested;
  EXPECT_FALSE(tested.Run(Json::Value()));
  EXPECT_EQ(tested.Response()->GetError(), 101);
}

TEST_F(Dispatch, RunWithAnEmptyObjectIs101) {
  TestRunner tested;
  EXPECT_FALSE(tested.Run(Json::Value(Json::objectValue)));
  EXPECT_EQ(tested.Response()->GetError(), 101);
}

TEST_F(Dispatch, RunWithoutApiIs101) {
  TestRunner tested;
  EXPECT_FALSE(tested.Run(Parse(R"({"getParam": {"version": 1}})")));
  EXPECT_EQ(tested.Response()->GetError(), 101);
}

TEST_F(Dispatch, RunOfARelayRequestIs101AndProcessOfItIs109) {
  WriteDescription(Description("state"));
  TestRunner tested;
  EXPECT_FALSE(tested.Run(Parse(R"({"getParam": {"api": "QELO.Test.Call", "version": 1,
                                                 "method": "run", "relay_zt": 5}})")));
  EXPECT_EQ(tested.Response()->GetError(), 101);
  MakeRequest("QELO.Test.Call", 1, "run", Parse(R"({"relay_zt": 5})"));
  EXPECT_FALSE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 109);
}

TEST_F(Dispatch, RunMakesTheCall) {
  WriteDescription(Description("state"));
  TestRunner tested;
  EXPECT_TRUE(tested.Run(Parse(R"({"postParam": {"api": "QELO.Test.Call", "version": 1,
                                                 "method": "run"}})")));
  const Json::Value answer = tested.GetResponse();
  EXPECT_EQ(answer["success"], Json::Value(true));
  EXPECT_EQ(answer["httpd_restart"], Json::Value(false));
  EXPECT_EQ(answer["data"]["code"], Json::Value(117));  // preset during the call
}

TEST_F(Dispatch, InitializeLaysEnvironmentSessionAttributesAndParameters) {
  setenv("RUNNER_TEST", "a=b", 1);
  TestRunner tested;
  EXPECT_TRUE(tested.Initialize(Parse(R"({"environ": {"REQUEST_METHOD": "POST", "N": 1},
    "session": {"username": "alice"}, "attr": {"colour": "red"}, "getParam": {"x": [1]}})")));
  const APIRequest& made = *tested.Request();
  EXPECT_EQ(made.GetEnv("RUNNER_TEST"), Json::Value("a=b"));
  EXPECT_EQ(made.GetRequestMethod(), APIRequest::METHOD_POST);
  EXPECT_FALSE(made.HasEnv("N"));
  EXPECT_EQ(made.GetLoginUserName(), "alice");
  EXPECT_EQ(made.GetAttr("colour"), Json::Value("red"));
  EXPECT_EQ(made.GetParam("x"), Parse("[1]"));
  EXPECT_FALSE(made.HasParam("environ"));
  unsetenv("RUNNER_TEST");
}

TEST_F(Dispatch, EnvironmentIntoANonObjectIs101) {
  TestRunner tested;
  Json::Value list(Json::arrayValue);
  EXPECT_FALSE(tested.InitEnv(list));
  EXPECT_EQ(tested.Response()->GetError(), 101);
}

TEST_F(Dispatch, EnvironmentEntryWithoutAnEqualsSignIsSkipped) {
  TestRunner tested;
  char bare[] = "BARE";
  char full[] = "FULL=b=c";
  char empty[] = "EMPTY=";
  char* entries[] = {bare, full, empty, nullptr};
  char** former = environ;
  Json::Value env(Json::objectValue);
  environ = entries;
  const bool gathered = tested.InitEnv(env);
  environ = former;
  EXPECT_TRUE(gathered);
  EXPECT_EQ(env, Parse(R"({"FULL": "b=c", "EMPTY": ""})"));
}

TEST_F(Dispatch, RequestThatADaemonServesIsNotRunInProcess) {
  struct DaemonRunner : TestRunner {
    bool CanProcessSocket(APIRequest* request) override {
      asked += "socket " + request->GetAPIMethod() + " ";
      return true;
    }
  } tested;
  WriteDescription(Description("state"));
  MakeRequest("QELO.Test.Call", 1, "run");
  platform->daemonConnects = false;
  SyslogCapture::Clear();
  EXPECT_FALSE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(tested.asked, "socket run need ");
  // Nobody's credentials were taken.
  const std::vector<std::string> expected{"QLIBCFileExist(QELO.Test.lib)",
                                          "QLIBCFileExist(QELO.Test.Call.lib)", "Connect()",
                                          "Disconnect()"};
  EXPECT_EQ(platform->calls, expected);
  EXPECT_EQ(SyslogCapture::Openings().size(), 2u);  // named before and after
  MakeRequest("QELO.Test.Call", 9, "run");
  tested.asked.clear();
  EXPECT_FALSE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 104);
  EXPECT_EQ(tested.asked, "");
}

TEST_F(Dispatch, CompoundDepthCountsTheRequestsAroundACall) {
  struct DepthRunner : TestRunner {
    bool NeedPermission(APIRequest*) override {
      asked += std::to_string(CompoundDepth()) + " ";
      return false;
    }
    int Depth() const { return CompoundDepth(); }
  } tested;
  Json::Value entries = Parse(R"({"minVersion": 1, "maxVersion": 2,
                                  "methods": {"2": [{"echo": {"grantable": true}}]}})");
  entries["lib"] = std::string(TEST_PLUGIN_DIR) + "/entries.so";
  WriteDescription(entries, "QELO.Test.Entries");
  WriteDescription(Parse(R"({"lib": "", "minVersion": 1, "maxVersion": 1,
                             "methods": {"1": [{"request": {"grantable": true}}]}})"),
                   "QELO.Entry.Request");
  MakeRequest("QELO.Entry.Request", 1, "request", Parse(R"({"compound": [
      {"api": "QELO.Test.Entries", "version": 2, "method": "echo"},
      {"api": "QELO.Entry.Request", "version": 1, "method": "request", "compound":
        [{"api": "QELO.Test.Entries", "version": 2, "method": "echo"}]},
      {"api": "QELO.Test.Entries", "version": 2, "method": "echo"}]})"));
  EXPECT_EQ(tested.Depth(), 0);
  EXPECT_TRUE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(tested.asked, "1 2 1 ");
  EXPECT_EQ(tested.Depth(), 0);
  EXPECT_EQ(Data()["has_fail"], Json::Value(false));
}

TEST_F(Dispatch, EntryWithoutCompoundIs110AndOtherMethodsSetNothing) {
  TestRunner tested;
  MakeRequest("QELO.Entry.Request", 1, "request");
  EXPECT_FALSE(tested.ProcessEntry(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 110);
  MakeRequest("QELO.Entry.Request", 1, "list");
  EXPECT_FALSE(tested.ProcessEntry(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 0);
  EXPECT_EQ(response->GetBody(), Json::Value(Json::objectValue));
}

TEST_F(Dispatch, CompoundApiHasNoOtherMethodThoughItsDescriptionListsOne) {
  WriteDescription(Description("state"));
  WriteDescription(Parse(R"({"lib": "", "minVersion": 1, "maxVersion": 1,
                             "methods": {"1": ["request", "list"]}})"),
                   "QELO.Entry.Request");
  MakeRequest("QELO.Entry.Request", 1, "list", Parse(R"({"compound": [
      {"api": "QELO.Test.Call", "version": 1, "method": "run"}]})"));
  TestRunner tested;
  ASSERT_TRUE(tested.CheckRequestParam(request.get(), response.get()));
  EXPECT_FALSE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 0);
  EXPECT_EQ(response->GetBody(), Json::Value(Json::objectValue));
  EXPECT_EQ(tested.asked, "");
}

/// Writes one byte for each call into the descriptor that the argument points to.
void writeByte(void* argument) {
  [[maybe_unused]] const ssize_t count = write(*static_cast<int*>(argument), "x", 1);
}

TEST_F(Dispatch, NoCallbacksForkNothing) {
  MakeRequest("QELO.Test.Call", 1, "run");
  TestRunner tested;
  EXPECT_FALSE(tested.HandleCallback(response.get()));
  EXPECT_FALSE(tested.HandleCallback(nullptr));
  EXPECT_TRUE(platform->calls.empty());
}

TEST_F(Dispatch, CallbacksRunInAnotherProcessAfterASecond) {
  MakeRequest("QELO.Test.Call", 1, "run");
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  int other = ends[1];
  response->SetCallbackFunc(writeByte, &ends[1]);
  response->SetCallbackFunc(writeByte, &other);
  const auto start = Clock::now();
  EXPECT_TRUE(TestRunner().HandleCallback(response.get()));
  EXPECT_LT(Clock::now() - start, std::chrono::milliseconds(500));
  close(ends[1]);
  char bytes[8];
  EXPECT_EQ(read(ends[0], bytes, 1), 1);
  EXPECT_GE(Clock::now() - start, std::chrono::milliseconds(950));
  EXPECT_EQ(read(ends[0], bytes, 1), 1);
  EXPECT_EQ(read(ends[0], bytes, sizeof bytes), 0);
  close(ends[0]);
  int status = -1;
  EXPECT_GT(wait(&status), 0);
  EXPECT_EQ(status, 0);
}

/// Where a callback writes which letter.
struct Mark {
  int fd;
  char letter;
};

void writeMark(void* argument) {
  const Mark* mark = static_cast<const Mark*>(argument);
  [[maybe_unused]] const ssize_t count = write(mark->fd, &mark->letter, 1);
}

TEST_F(Dispatch, CallbacksRunInTheOrderOfTheirRegistrationWithTheirArguments) {
  MakeRequest("QELO.Test.Call", 1, "run");
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  Mark marks[] = {{ends[1], 'c'}, {ends[1], 'a'}, {ends[1], 'b'}};
  response->SetCallbackFunc(writeMark, &marks[0]);
  response->SetCallbackFunc(writeByte, &ends[1]);
  response->SetCallbackFunc(writeMark, &marks[1]);
  response->SetCallbackFunc(writeMark, &marks[2]);
  EXPECT_TRUE(TestRunner().HandleCallback(response.get()));
  close(ends[1]);
  EXPECT_GT(wait(nullptr), 0);
  char letters[8] = {};
  EXPECT_EQ(read(ends[0], letters, sizeof letters), 4);
  EXPECT_STREQ(letters, "cxab");
  close(ends[0]);
}

TEST_F(Dispatch, FailedForkOfCallbacksReturns) {
  MakeRequest("QELO.Test.Call", 1, "run");
  int unused = 0;
  response->SetCallbackFunc(writeByte, &unused);
  platform->forkResult = -1;
  EXPECT_FALSE(TestRunner().HandleCallback(response.get()));
}

}  // namespace
}  // namespace QELO
