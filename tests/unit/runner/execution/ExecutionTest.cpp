#include <fcntl.h>
#include <grp.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <syslog.h>

#include <algorithm>
#include <iostream>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class Execution : public RunnerTest {
 protected:
  static bool IsRoot() { return geteuid() == 0; }
};

TEST_F(Execution, RunsTheMethodWithThePresetAnswer) {
  EXPECT_TRUE(ProcessPlugin("state"));
  EXPECT_EQ(response->GetError(), 0);
  EXPECT_EQ(Data()["code"], Json::Value(117));
}

TEST_F(Execution, MethodThatSetsNothingAnswers117) {
  EXPECT_TRUE(ProcessPlugin("state", "{}", 1, "stayIdle"));
  EXPECT_EQ(response->GetError(), 117);
}

TEST_F(Execution, LibraryThatCannotBeUsedIs111) {
  for (const char* plugin : {"no_such_library", "no_table", "null_table", "throwing_table"}) {
    EXPECT_FALSE(ProcessPlugin(plugin)) << plugin;
    EXPECT_EQ(response->GetError(), 111) << plugin;
  }
}

TEST_F(Execution, EmptyLibraryPathIs111) {
  Json::Value description = Description("state");
  description["lib"] = "";
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  EXPECT_FALSE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 111);
  EXPECT_EQ(SyslogCapture::Count("library path empty"), 1);
}

TEST_F(Execution, MethodMissingFromTheTableIs121) {
  EXPECT_FALSE(ProcessPlugin("state", "{}", 2));
  EXPECT_EQ(response->GetError(), 121);
}

TEST_F(Execution, NullCheckTableRuns) {
  EXPECT_TRUE(ProcessPlugin("null_check_table"));
  EXPECT_EQ(Data(), Json::Value("ran"));
}

TEST_F(Execution, RefusingCheckStopsTheCallWithItsOwnError) {
  EXPECT_FALSE(ProcessPlugin("checked", "{}", 1));
  EXPECT_EQ(response->GetError(), 444);
}

TEST_F(Execution, PassingCheckLetsTheCallRun) {
  EXPECT_TRUE(ProcessPlugin("checked", "{}", 2));
  EXPECT_EQ(Data(), Json::Value("ran"));
}

TEST_F(Execution, ThrowingCheckStopsTheCallWith117) {
  EXPECT_FALSE(ProcessPlugin("checked", "{}", 3));
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(SyslogCapture::Count("check function threw an exception: check failed"), 1);
}

TEST_F(Execution, ExceptionOfAMethodIsLoggedAndAnswers117) {
  EXPECT_FALSE(ProcessPlugin("throwing", "{}", 1));
  EXPECT_EQ(response->GetBody(), Parse(R"({"success": false, "error": {"code": 117}})"));
  EXPECT_EQ(SyslogCapture::Count("method threw an exception: method failed"), 1);
  EXPECT_FALSE(ProcessPlugin("throwing", "{}", 2));
  EXPECT_EQ(response->GetError(), 117);
}

TEST_F(Execution, AttributesThatAreNoObjectTakeNoDefaults) {
  WriteLibDef(R"({"methods": {"grantByDefault": true, "runAs": "nobody"}})");
  for (const char* attributes : {"null", "\"text\"", "[]"}) {
    platform->calls.clear();
    ProcessPlugin("state", attributes);
    EXPECT_EQ(std::count(platform->calls.begin(), platform->calls.end(),
                         "ResetCredentialsByName(system, drop)"),
              1)
        << attributes;
  }
}

TEST_F(Execution, CrashEndsItsOwnProcess) {
  const pid_t child = fork();
  if (child == 0) {
    signal(SIGSEGV, SIG_DFL);
    ProcessPlugin("crashing");
    _exit(0);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFSIGNALED(status));
}

// Permission hooks

TEST_F(Execution, SharingRequestAsksTheSharingCheckAlone) {
  WriteDescription(Description("state"));
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitEnv(Parse(R"({"HTTP_X_QELO_SHARING": "abc"})"));
  TestRunner tested;
  tested.sharing = false;
  tested.need = true;
  EXPECT_FALSE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(tested.asked, "sharing skip ");
}

TEST_F(Execution, RefusedSharingRequestRunsWhereTheCheckIsSkipped) {
  WriteDescription(Description("state"));
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitEnv(Parse(R"({"HTTP_X_QELO_SHARING": "abc"})"));
  TestRunner tested;
  tested.sharing = false;
  tested.skip = true;
  EXPECT_TRUE(tested.Process(request.get(), response.get()));
  EXPECT_EQ(tested.asked, "sharing skip ");
  EXPECT_EQ(response->GetError(), 0);
}

TEST_F(Execution, NoNeedNoCheck) {
  EXPECT_TRUE(ProcessPlugin("state"));
  EXPECT_EQ(runner->asked, "need ");
}

TEST_F(Execution, RefusalStandsUnlessSkipped) {
  WriteDescription(Description("state"));
  for (const bool skip : {false, true}) {
    MakeRequest("QELO.Test.Call", 1, "run");
    TestRunner tested;
    tested.need = true;
    tested.permission = false;
    tested.skip = skip;
    EXPECT_EQ(tested.Process(request.get(), response.get()), skip);
    EXPECT_EQ(tested.asked, "need check skip ");
    EXPECT_EQ(response->GetError(), skip ? 0 : 105);
  }
}

// Uploads

TEST_F(Execution, UploadIsTakenBeforeTheCall) {
  for (const bool taken : {true, false}) {
    WriteDescription(Description("state", R"({"allowUpload": true})"));
    MakeRequest("QELO.Test.Call", 1, "run");
    request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data"})"));
    TestRunner tested;
    tested.upload = taken;
    EXPECT_EQ(tested.Process(request.get(), response.get()), taken);
    EXPECT_EQ(tested.asked, "need upload ");
  }
}

TEST_F(Execution, UploadToAMethodWithoutAllowUploadIsNotTaken) {
  WriteDescription(Description("state"));
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data"})"));
  TestRunner tested;
  EXPECT_FALSE(tested.ProcessLib(request.get(), response.get()));
  EXPECT_EQ(tested.asked, "need ");
}

// The process around the call

TEST_F(Execution, WorkingDirectoryAndStreamBufferComeBack) {
  std::streambuf* buffer = std::cout.rdbuf();
  EXPECT_TRUE(ProcessPlugin("wandering"));
  EXPECT_EQ(std::filesystem::current_path(), directory);
  EXPECT_EQ(std::cout.rdbuf(), buffer);
}

TEST_F(Execution, NoDescriptorStaysOpen) {
  const auto count = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"),
                         std::filesystem::directory_iterator());
  };
  ProcessPlugin("state");
  const auto before = count();
  for (const char* plugin : {"state", "printing", "reading", "no_table", "throwing"}) {
    ProcessPlugin(plugin);
  }
  EXPECT_EQ(count(), before);
}

TEST_F(Execution, PriorityHoldsForTheCallAlone) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root may raise the priority again";
  }
  Json::Value description = Description("state");
  description["priority"] = 5;
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  const int former = getpriority(PRIO_PROCESS, 0);
  EXPECT_TRUE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(Data()["priority"], Json::Value(5));
  EXPECT_EQ(getpriority(PRIO_PROCESS, 0), former);
}

// Credentials

TEST_F(Execution, RunsAsSystemByDefault) {
  ProcessPlugin("state");
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(system, drop)");
}

TEST_F(Execution, RunAsOfTheApiIsReplacedByTheMethods) {
  Json::Value description = Description("state");
  description["runAs"] = "backup";
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  TestRunner().Process(request.get(), response.get());
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(backup, drop)");

  description["methods"]["1"][0]["run"]["runAs"] = "media";
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  TestRunner().Process(request.get(), response.get());
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(media, drop)");
}

TEST_F(Execution, GrantableKeepsThePrivilege) {
  ProcessPlugin("state", R"({"grantable": true})");
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(system, keep)");
}

TEST_F(Execution, RefusedSwitchAnswers117) {
  platform->credentialResult = false;
  EXPECT_FALSE(ProcessPlugin("state"));
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(SyslogCapture::Count("grantable failed. ["), 1);
}

TEST_F(Execution, GrantByUserTakesTheLoginUser) {
  WriteDescription(Description("state", R"({"grantByUser": true, "grantable": true})"));
  MakeRequest("QELO.Test.Call", 1, "run");
  request->InitSession(Parse(R"({"username": "alice"})"));
  EXPECT_TRUE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(platform->calls.back(), "ResetCredentialsByName(alice, keep)");

  platform->credentialResult = false;
  EXPECT_FALSE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(SyslogCapture::Count("grantByUser failed. ["), 1);
}

TEST_F(Execution, GrantByUserWithoutLoginUserAnswers117) {
  EXPECT_FALSE(ProcessPlugin("state", R"({"grantByUser": true})"));
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(SyslogCapture::Count("grantByUser: failed to get login username."), 1);
}

TEST_F(Execution, GrantByDefaultAsRootSwitchesNothingAndGivesBack) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  SyslogCapture::Clear();
  EXPECT_TRUE(ProcessPlugin("state", R"({"grantByDefault": true})"));
  EXPECT_EQ(SyslogCapture::Count("(-1, 0, -1)"), 0);
  EXPECT_EQ(SyslogCapture::Count("WARNING: setresgid(0, 0, 0)"), 1);
  EXPECT_EQ(SyslogCapture::Count("WARNING: setresuid(0, 0, 0)"), 1);
}

TEST_F(Execution, RegainingRootIsLoggedToTheAuthorisationFacility) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  ProcessPlugin("state");
  ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
  EXPECT_EQ(SyslogCapture::Count("WARNING: setresuid(-1, 0, -1)"), 1);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_AUTH | LOG_INFO);
}

/// Runs the test's body in a child that has these effective ids, with root within reach or not.
class Unprivileged : public Execution {
 protected:
  template <typename Body>
  static void RunAs(uid_t uid, bool rootInReach, Body body) {
    if (!IsRoot()) {
      GTEST_SKIP() << "needs root";
    }
    const pid_t child = fork();
    if (child == 0) {
      const bool switched = setgroups(0, nullptr) == 0 &&
                            setresgid(uid, uid, rootInReach ? 0 : uid) == 0 &&
                            setresuid(uid, uid, rootInReach ? 0 : uid) == 0;
      _exit(switched && body() ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  void SetUp() override {
    Execution::SetUp();
    std::filesystem::permissions(directory, static_cast<std::filesystem::perms>(0755));
    WriteDescription(Description("state"));
    MakeRequest("QELO.Test.Call", 1, "run");
  }
};

TEST_F(Unprivileged, SwitchToTheUserThatRunsAlreadySucceeds) {
  RunAs(4242, false, [&] {
    platform->credentialResult = false;
    platform->userGetUGID = [](const std::string& name, uid_t* uid, gid_t* gid) {
      *uid = *gid = 4242;
      return name == "system" ? 0 : -1;
    };
    return TestRunner().Process(request.get(), response.get()) &&
           SyslogCapture::Count("ERROR: setresuid(-1, 0, -1) [") == 1 &&
           SyslogCapture::Messages()[0].priority == (LOG_AUTH | LOG_ERR);
  });
}

TEST_F(Unprivileged, SwitchToAnotherUserIsLeftToThePlatform) {
  RunAs(4242, false, [&] {
    platform->credentialResult = false;
    platform->userGetUGID = [](const std::string&, uid_t* uid, gid_t* gid) {
      *uid = *gid = 4343;
      return 0;
    };
    return !TestRunner().Process(request.get(), response.get()) && response->GetError() == 117;
  });
}

TEST_F(Unprivileged, GrantByDefaultTakesRootForTheCallAndGivesItBack) {
  WriteDescription(Description("state", R"({"grantByDefault": true})"));
  RunAs(4242, true, [&] {
    return TestRunner().Process(request.get(), response.get()) &&
           Data()["euid"] == Json::Value(0) && Data()["egid"] == Json::Value(0) &&
           geteuid() == 4242 && getegid() == 4242 &&
           SyslogCapture::Count("WARNING: setresgid(-1, 0, -1)") == 1 &&
           SyslogCapture::Count("WARNING: setresuid(-1, 0, -1)") == 1 &&
           SyslogCapture::Count("WARNING: setresuid(4242") == 0;
  });
}

TEST_F(Unprivileged, GrantByDefaultWithoutRootAnswers117) {
  WriteDescription(Description("state", R"({"grantByDefault": true})"));
  RunAs(4242, false, [&] {
    return !TestRunner().Process(request.get(), response.get()) && response->GetError() == 117 &&
           SyslogCapture::Count("grantByDefault failed. [") == 1 &&
           SyslogCapture::Count("ERROR: setresgid(-1, 0, -1) [") == 1;
  });
}

TEST_F(Unprivileged, RefusedSwitchDoesNotLeaveRootBehind) {
  RunAs(4242, true, [&] {
    platform->credentialResult = false;
    return !TestRunner().Process(request.get(), response.get()) && geteuid() == 4242;
  });
}

}  // namespace
}  // namespace QELO
