// One entry's life: from the CGI environment to the printed answer and the work after it.

#include <dlfcn.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <filesystem>
#include <regex>
#include <stdexcept>

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

class EntryLifecycle : public CgiTest {
 protected:
  /// A description that anybody may call.
  static void DescribeOpen() { Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})"); }

  /// As DescribeOpen(), by a library that no other test has loaded. @return its path
  std::string DescribeOpenByOwnLibrary() {
    const std::string library = directory / "own.so";
    std::filesystem::copy_file(TEST_PLUGIN_DIR "/good.so", library);
    Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})", library);
    return library;
  }

  static bool IsLoaded(const std::string& library) {
    void* handle = dlopen(library.c_str(), RTLD_LAZY | RTLD_NOLOAD);
    if (handle != nullptr) {
      dlclose(handle);
    }
    return handle != nullptr;
  }

  static std::string ThreadName() {
    char name[17] = {};
    prctl(PR_GET_NAME, name);
    return name;
  }
};

/// An entry that has read its whole request when its initialization fails, or does not.
class InitializedEntry : public TestEntry {
 public:
  explicit InitializedEntry(bool goesOn) : goesOn_(goesOn) {}
  bool Initialize(const Json::Value& param) override {
    EXPECT_TRUE(TestEntry::Initialize(param));
    Response()->SetError(goesOn_ ? 0 : 101);
    return goesOn_;
  }

 private:
  const bool goesOn_;
};

constexpr char kEcho[] = "api=QELO.Test.Good&version=1&method=echo";

TEST_F(EntryLifecycle, InitializeLaysEnvironmentSessionAndParameters) {
  platform->language = "ger";
  platform->tokenEnable = 1;
  Get("api=QELO.Test.Good&version=1&method=echo&x=1");
  TestEntry entry;
  EXPECT_TRUE(entry.Initialize(Json::Value()));
  EXPECT_EQ(platform->calls[0], "QeloCgiInit()");
  EXPECT_EQ(platform->calls[1], "QeloCgiLoadInCookies()");
  const APIRequest& request = *entry.Request();
  EXPECT_EQ(request.GetAttr("_collector_count_webapi"), Json::Value(true));
  EXPECT_EQ(request.GetUILanguage(), "ger");
  EXPECT_TRUE(request.IsTokenEnable());
  EXPECT_EQ(request.GetRemoteIP(), "192.0.2.7");
  EXPECT_EQ(request.GetRequestMethod(), APIRequest::METHOD_GET);
  EXPECT_EQ(request.GetAPIClass(), "QELO.Test.Good");
  EXPECT_EQ(request.GetParam("x"), Json::Value(1));
}

TEST_F(EntryLifecycle, InitializeGoesOnWithoutARemoteAddress) {
  platform->remoteAddress = "";
  Get("api=a");
  TestEntry entry;
  EXPECT_TRUE(entry.Initialize(Json::Value()));
  EXPECT_FALSE(entry.Request()->HasEnv("QELO_REMOTE_IP"));
  EXPECT_EQ(entry.Response()->GetError(), 0);
}

TEST_F(EntryLifecycle, RemoteAddressHas64BytesAtMost) {
  const std::string longest(64, '1');
  for (const std::string& address : {longest, longest + "2"}) {
    platform->remoteAddress = address;
    Get("api=a");
    TestEntry entry;
    EXPECT_TRUE(entry.Initialize(Json::Value()));
    EXPECT_EQ(entry.Request()->GetRemoteIP(), longest);
  }
}

TEST_F(EntryLifecycle, TokenFlagIsTheCgiLibrarysNumberAndReadsAsATruth) {
  for (const int flag : {0, 1, 2, -1}) {
    platform->tokenEnable = flag;
    Get("api=a");
    TestEntry entry;
    EXPECT_TRUE(entry.Initialize(Json::Value()));
    EXPECT_EQ(entry.Request()->Serialize()["session"]["tokenEnable"], Json::Value(flag));
    EXPECT_EQ(entry.Request()->IsTokenEnable(), flag != 0);
    for (const bool truth : {false, true}) {
      Json::Value session;
      session["tokenEnable"] = truth;
      entry.Request()->InitSession(session);
      EXPECT_EQ(entry.Request()->IsTokenEnable(), truth);
    }
  }
}

TEST_F(EntryLifecycle, RunPrintsTheMethodsAnswer) {
  DescribeOpen();
  Get(std::string(kEcho) + "&name=a%20b");
  const CgiAnswer answer = Serve();
  EXPECT_TRUE(answer.HasLine("Content-type: application/json; charset=\"UTF-8\""));
  EXPECT_TRUE(answer.Json()["success"].asBool());
  EXPECT_EQ(answer.Json()["data"]["name"], "a b");
}

TEST_F(EntryLifecycle, RunReadsAPostedCall) {
  DescribeOpen();
  Post(std::string(kEcho) + "&name=posted");
  EXPECT_EQ(Serve().Json()["data"]["name"], "posted");
}

TEST_F(EntryLifecycle, RunLetsPostOverrideGet) {
  DescribeOpen();
  Get("api=QELO.Other&version=7&method=none&name=got");
  Post(std::string(kEcho) + "&name=posted");
  EXPECT_EQ(Serve().Json()["data"]["name"], "posted");
}

TEST_F(EntryLifecycle, RunAnswersTheMethodsError) {
  DescribeOpen();
  Get("api=QELO.Test.Good&version=1&method=fail");
  EXPECT_EQ(Serve().Code(), 400);
}

TEST_F(EntryLifecycle, RunAnswers117ForASilentMethod) {
  DescribeOpen();
  Get("api=QELO.Test.Good&version=1&method=silent");
  EXPECT_EQ(Serve().Code(), 117);
}

TEST_F(EntryLifecycle, RunWithoutAnApiAnswers101) {
  Get("");
  EXPECT_EQ(Serve().Code(), 101);
}

TEST_F(EntryLifecycle, RunWithAnUnknownApiAnswers102) {
  Get("api=QELO.Nothing&version=1&method=x");
  EXPECT_EQ(Serve().Code(), 102);
}

TEST_F(EntryLifecycle, FailedInitializationStillPrintsAndCallsNothing) {
  const std::string library = DescribeOpenByOwnLibrary();
  Get(kEcho);
  for (const bool goesOn : {false, true}) {
    char argument[32] = "program";
    char* arguments[] = {argument, nullptr};
    InitializedEntry entry(goesOn);
    entry.SetArgs(1, arguments);
    prctl(PR_SET_NAME, "program");
    SyslogCapture::Clear();
    const CgiAnswer answer = Printed([&entry] { entry.Run(Json::Value()); });
    EXPECT_EQ(answer.Code(), goesOn ? 0 : 101);
    EXPECT_TRUE(answer.HasLine("Pragma: no-cache"));
    EXPECT_EQ(Calls("QLIBCFileExist") > 0, goesOn);
    EXPECT_EQ(IsLoaded(library), goesOn);
    EXPECT_EQ(SyslogCapture::Openings().empty(), !goesOn);
    EXPECT_EQ(ThreadName(), goesOn ? "QELO.Test.Good_" : "program");
    EXPECT_EQ(std::string(argument) == "program", !goesOn);
  }
}

TEST_F(EntryLifecycle, BodyThatCannotBeReadStopsBeforeCredentialsAndTheCall) {
  DescribeOpen();
  Get(std::string(kEcho) + "&_sid=X");
  Set("REQUEST_METHOD", "POST");
  Set("CONTENT_LENGTH", "0");
  const CgiAnswer answer = Serve();
  EXPECT_EQ(answer.Code(), 101);
  EXPECT_EQ(Calls("QeloCgiLoadInCookies"), 1);
  EXPECT_EQ(Environment("HTTP_COOKIE"), "(unset)");
  EXPECT_EQ(Calls("QLIBCFileExist"), 0);
}

TEST_F(EntryLifecycle, ExceptionIsLoggedAndAnswered117) {
  struct Throwing : TestEntry {
    bool Initialize(const Json::Value&) override { throw std::runtime_error("no memory"); }
  } entry;
  const CgiAnswer answer = Printed([&entry] { entry.Run(Json::Value()); });
  EXPECT_EQ(answer.Code(), 117);
  EXPECT_TRUE(answer.HasLine("Content-type: application/json; charset=\"UTF-8\""));
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
  EXPECT_TRUE(std::regex_match(SyslogCapture::Messages()[0].text,
                               std::regex(R"(WebEntry\.cpp:\d+ no memory)")))
      << SyslogCapture::Messages()[0].text;
}

TEST_F(EntryLifecycle, RunDoesNotConsultItsArgument) {
  DescribeOpen();
  Get(kEcho);
  const CgiAnswer answer = Printed([] {
    TestEntry entry;
    entry.Run(CgiTest::Parse(R"({"getParam": {"method": "fail"}})"));
  });
  EXPECT_TRUE(answer.Json()["success"].asBool());
}

TEST_F(EntryLifecycle, RunCallsADerivedInitialize) {
  struct Derived : TestEntry {
    bool Initialize(const Json::Value& param) override {
      sawNull = param.isNull();
      return false;
    }
    bool sawNull = false;
  } entry;
  const CgiAnswer answer = Printed([&entry] { entry.Run(Json::Value(1)); });
  EXPECT_TRUE(entry.sawNull);
  EXPECT_EQ(answer.Body(), "{}");
}

TEST_F(EntryLifecycle, DisabledOutputPrintsNothingButRestarts) {
  platform->forkResult = 4321;
  TestEntry entry;
  entry.Response()->SetEnableOutput(false);
  entry.Response()->SetHttpdRestart(true);
  bool started = false;
  const CgiAnswer answer = Printed([&] { started = entry.Run(Json::Value()); });
  EXPECT_EQ(answer.text, "");
  EXPECT_TRUE(started);
  EXPECT_EQ(Calls("QLIBCProcFork"), 1);
  const APIResponse::CallbackList expected{{RestartHttpd, nullptr}};
  EXPECT_EQ(*entry.Response()->GetCallbackFuncs(), expected);
}

TEST_F(EntryLifecycle, NoRestartAskedForRegistersNone) {
  TestEntry entry;
  bool started = true;
  Printed([&] { started = entry.Run(Json::Value()); });
  EXPECT_FALSE(started);
  EXPECT_TRUE(entry.Response()->GetCallbackFuncs()->empty());
}

TEST_F(EntryLifecycle, RestartComesAfterTheBodyAndInAnotherProcess) {
  struct Report {
    pid_t process;
    off_t printed;
  };
  static int pipe[2];
  ASSERT_EQ(pipe2(pipe, O_CLOEXEC), 0);
  TestEntry entry;
  entry.Response()->SetHttpdRestart(true);
  // Called in the restart's process right before it: tells what has been printed by then.
  entry.Response()->SetCallbackFunc(
      [](void*) {
        struct stat output {};
        fstat(STDOUT_FILENO, &output);
        const Report report{getpid(), output.st_size};
        _exit(write(pipe[1], &report, sizeof report) == sizeof report ? 0 : 1);
      },
      nullptr);
  const CgiAnswer answer = Printed([&] { entry.Run(Json::Value()); });
  EXPECT_EQ(answer.Code(), 101);
  const APIResponse::CallbackFunc last = entry.Response()->GetCallbackFuncs()->back().first;
  EXPECT_EQ(last, RestartHttpd);
  Report report{};
  ASSERT_EQ(read(pipe[0], &report, sizeof report), static_cast<ssize_t>(sizeof report));
  EXPECT_NE(report.process, getpid());
  EXPECT_EQ(report.printed, static_cast<off_t>(answer.text.size()));
  waitpid(report.process, nullptr, 0);
  close(pipe[0]);
  close(pipe[1]);
}

TEST_F(EntryLifecycle, ClientThatIsGoneDoesNotEndTheProcess) {
  int pipes[2];
  ASSERT_EQ(pipe2(pipes, O_CLOEXEC), 0);
  close(pipes[0]);
  platform->forkResult = 4321;
  TestEntry entry;
  entry.Response()->SetHttpdRestart(true);
  bool started = false;
  {
    fflush(stdout);
    const Redirection output(STDOUT_FILENO, pipes[1]);
    started = entry.Run(Json::Value());
  }
  close(pipes[1]);
  EXPECT_TRUE(started);
  EXPECT_EQ(Calls("QLIBCProcFork"), 1);
}

// The entry names the process before it decides; dispatch once more, when the call has ended.
TEST_F(EntryLifecycle, RelayIsNotDispatched) {
  DescribeOpen();
  const auto namings = [](const std::string& query) {
    Get(query);
    TestEntry entry;
    SyslogCapture::Clear();
    Printed([&entry] { entry.Run(Json::Value()); });
    return SyslogCapture::Openings().size();
  };
  EXPECT_EQ(namings(std::string(kEcho) + "&relay_zt=1"), 1U);
  EXPECT_EQ(namings(std::string(kEcho) + "&relay_zt="), 1U);
  EXPECT_EQ(namings(kEcho), 2U);
}

TEST_F(EntryLifecycle, RelayWithoutAnApiIs101) {
  Get("version=1&method=echo&relay_zt=1");
  EXPECT_EQ(Serve().Code(), 101);
}

TEST_F(EntryLifecycle, RefusedSharingRequestRunsWhereTheCheckIsSkipped) {
  Describe(R"({"authLevel": 2})", R"({"grantByDefault": true})");
  Get(std::string(kEcho) + "&name=shared&_sharing_id=S");
  const CgiAnswer answer = Serve();
  EXPECT_EQ(answer.Json()["data"]["name"], "shared");
  EXPECT_FALSE(answer.Json().isMember("error"));
}

TEST_F(EntryLifecycle, SharingRequestIsRefusedWith126) {
  DescribeOpen();
  Get(std::string(kEcho) + "&_sharing_id=S");
  TestEntry entry;
  const CgiAnswer answer = Printed([&] { entry.Run(Json::Value()); });
  EXPECT_EQ(answer.Code(), 126);
  EXPECT_EQ(entry.Request()->GetAuthResult(), AUTHORIZED_UNKNOWN);
}

TEST_F(EntryLifecycle, CallThatNeedsALoginIsRefusedWithoutOne) {
  Describe(R"({"authLevel": 1, "allowUser": ["normal.local"]})", R"({"grantByDefault": true})");
  Get(kEcho);
  const CgiAnswer answer = Serve();
  EXPECT_EQ(answer.Code(), 105);
  EXPECT_TRUE(answer.HasLine("x-request-error: noprivilege"));
}

TEST_F(EntryLifecycle, CallThatNeedsALoginRunsForItsUser) {
  Describe(R"({"authLevel": 1, "allowUser": ["normal.local"]})", R"({"grantByDefault": true})");
  platform->authorized = 1;
  platform->authorizedUser = "ann";
  Set("HTTP_COOKIE", "id=S");
  Get("api=QELO.Test.Good&version=1&method=whoami");
  const Json::Value data = Serve().Json()["data"];
  EXPECT_EQ(data["user"], "ann");
  EXPECT_EQ(data["isAdmin"], false);
  EXPECT_EQ(data["isAuthorized"], true);
  EXPECT_EQ(data["authResult"], 1);
  EXPECT_EQ(data["address"], "192.0.2.7");
}

TEST_F(EntryLifecycle, SkippedCheckRunsWithNobodyLoggedIn) {
  Describe(R"({"authLevel": 2})", R"({"grantByDefault": true})");
  platform->authorized = -1;
  platform->authorizedUser = "ann";
  Set("HTTP_COOKIE", "id=S");
  Get("api=QELO.Test.Good&version=1&method=whoami");
  const Json::Value data = Serve().Json()["data"];
  EXPECT_EQ(data["user"], "");
  EXPECT_EQ(data["isAuthorized"], false);
}

}  // namespace
}  // namespace QELO
