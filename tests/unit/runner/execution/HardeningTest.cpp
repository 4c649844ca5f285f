// What a careless or unlucky method must not do to the process around it.

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <cerrno>
#include <cstdarg>

#include "tests/unit/runner/RunnerFixture.h"

namespace {
bool failPrctl = false;
int priorityCalls = 0;
std::string namedThread;  ///< the name of the last PR_SET_NAME, as it was passed
}  // namespace

// These take the place of the C library's for the whole test program.
extern "C" __attribute__((visibility("default"))) int prctl(int option, ...) {
  if (failPrctl) {
    errno = EFAULT;
    return -1;
  }
  va_list args;
  va_start(args, option);
  const unsigned long argument = va_arg(args, unsigned long);
  va_end(args);
  if (option == PR_SET_NAME) {
    namedThread = reinterpret_cast<const char*>(argument);
  }
  return static_cast<int>(syscall(SYS_prctl, option, argument, 0, 0, 0));
}

extern "C" __attribute__((visibility("default"))) int setpriority(__priority_which_t which,
                                                                  id_t who, int value) noexcept {
  ++priorityCalls;
  return static_cast<int>(syscall(SYS_setpriority, which, who, value));
}

namespace QELO {
namespace {

class Hardening : public RunnerTest {
 protected:
  void TearDown() override {
    failPrctl = false;
    RunnerTest::TearDown();
  }
  /// Runs the body in a child. @return whether it ended with true
  template <typename Body>
  static bool InChild(Body body) {
    fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
      _exit(body() ? 0 : 1);
    }
    int status = -1;
    return waitpid(child, &status, 0) == child && status == 0;
  }
};

TEST_F(Hardening, ProcessThatCannotBeNamedIs118) {
  MakeRequest("QELO.Test.Call", 1, "run");
  TestRunner tested;
  failPrctl = true;
  EXPECT_FALSE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 118);
  EXPECT_EQ(SyslogCapture::Count("Set process name fail["), 1);
}

TEST_F(Hardening, ThreadNameIsCutTo16CharactersBeforeTheSystemCutsIt) {
  char longName[] = "a_program_of_a_long_name";
  char* const former = program_invocation_name;
  program_invocation_name = longName;
  {
    TestRunner tested;
    program_invocation_name = former;
    MakeRequest("QELO.Test.Call", 2, "run");
    EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
    EXPECT_EQ(namedThread, "QELO.Test.Call_2");
  }
  EXPECT_EQ(namedThread, "a_program_of_a_l");  // given back
  ::prctl(PR_SET_NAME, program_invocation_short_name);
}

TEST_F(Hardening, ClientsTextBeginsNoLogLineOfItsOwn) {
  TestRunner tested;
  MakeRequest("x\nsshd: Accepted", 1, "run");
  tested.SetProcessName(request.get(), response.get());
  EXPECT_EQ(SyslogCapture::Identity().find('\n'), std::string::npos);
  tested.CheckRequestParam(request.get(), response.get());
  EXPECT_EQ(SyslogCapture::Count("WebAPI x?sshd: Accepted is not valid"), 1);
}

TEST_F(Hardening, PriorityThatIsTheCurrentOneIsNotSet) {
  priorityCalls = 0;
  Json::Value description = Description("state");
  description["priority"] = getpriority(PRIO_PROCESS, 0);
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  EXPECT_TRUE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(priorityCalls, 0);
}

TEST_F(Hardening, PriorityComesBackAfterARefusedCheck) {
  Json::Value description = Description("checked");
  description["priority"] = 7;
  WriteDescription(description);
  MakeRequest("QELO.Test.Call", 1, "run");
  const int former = getpriority(PRIO_PROCESS, 0);
  priorityCalls = 0;
  EXPECT_FALSE(TestRunner().Process(request.get(), response.get()));
  EXPECT_EQ(priorityCalls, 2);
  EXPECT_TRUE(geteuid() != 0 || getpriority(PRIO_PROCESS, 0) == former);
}

TEST_F(Hardening, PriorityComesBackAfterAMissingMethodAndIsNotTakenForAMissingLibrary) {
  const int former = getpriority(PRIO_PROCESS, 0);
  for (const auto& [plugin, version, code, calls] :
       {std::tuple("state", 2, 121, 2), std::tuple("no_table", 1, 111, 0)}) {
    Json::Value description = Description(plugin);
    description["priority"] = 7;
    WriteDescription(description);
    MakeRequest("QELO.Test.Call", version, "run");
    priorityCalls = 0;
    EXPECT_FALSE(TestRunner().Process(request.get(), response.get()));
    EXPECT_EQ(response->GetError(), code);
    EXPECT_EQ(priorityCalls, calls);
    EXPECT_TRUE(geteuid() != 0 || getpriority(PRIO_PROCESS, 0) == former);
  }
}

TEST_F(Hardening, PriorityThatNobodyDescribesIsZero) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "only root may raise the priority";
  }
  WriteLibDef("{}");  // fills in a null
  EXPECT_TRUE(InChild([&] {
    ::setpriority(PRIO_PROCESS, 0, 5);
    return ProcessPlugin("state") && Data()["priority"] == Json::Value(0) &&
           getpriority(PRIO_PROCESS, 0) == 5;
  }));
}

TEST_F(Hardening, NoDescriptorLeftStopsTheCallAndKeepsTheStreams) {
  const std::pair<rlim_t, const char*> lacks[] = {{0, "cannot keep the working directory. ["},
                                                  {1, "cannot shut the standard streams. ["}};
  for (const auto& [left, message] : lacks) {
    EXPECT_TRUE(InChild([&, free = left, said = message] {
      ProcessPlugin("state");  // everything is loaded
      rlimit limit{};
      getrlimit(RLIMIT_NOFILE, &limit);
      const int next = open("/dev/null", O_RDONLY);
      limit.rlim_cur = static_cast<rlim_t>(next) + free;
      close(next);
      setrlimit(RLIMIT_NOFILE, &limit);
      response->SetSuccess();
      const bool called = runner->ProcessLib(request.get(), response.get());
      return !called && response->GetError() == 117 && fcntl(0, F_GETFD) >= 0 &&
             fcntl(1, F_GETFD) >= 0 && SyslogCapture::Count(said) == 1;
    }));
  }
}

TEST_F(Hardening, ClosedStandardDescriptorsStayClosed) {
  EXPECT_TRUE(InChild([&] {
    close(0);
    close(1);
    return ProcessPlugin("printing") && fcntl(0, F_GETFD) < 0 && fcntl(1, F_GETFD) < 0;
  }));
}

TEST_F(Hardening, TableEntryWithoutNameIsSkippedAndWithoutFunctionIs121) {
  EXPECT_TRUE(ProcessPlugin("holed_table", "{}", 1));
  EXPECT_FALSE(ProcessPlugin("holed_table", "{}", 2));
  EXPECT_EQ(response->GetError(), 121);
}

TEST_F(Hardening, BodyThatIsNoObjectIsReplacedInTheAnswer) {
  TestRunner tested;
  tested.Response()->Serialize()["body"] = "text";
  EXPECT_EQ(tested.GetResponse(), Parse(R"({"httpd_restart": false})"));
}

TEST_F(Hardening, RestartOfTheWebServerIsInTheAnswer) {
  TestRunner tested;
  tested.Response()->SetHttpdRestart(true);
  EXPECT_EQ(tested.GetResponse()["httpd_restart"], Json::Value(true));
}

TEST_F(Hardening, CountingNeedsTheRunnersOwnAttribute) {
  platform->settings["enable_data_collect"] = "yes";
  EXPECT_TRUE(InChild([&] {
    std::filesystem::remove_all(Paths::kCounterDir);
    WriteDescription(Description("state"));
    MakeRequest("QELO.Test.Call", 1, "run");
    request->SetAttr("_collector_count_webapi", true);
    return TestRunner().Process(request.get(), response.get()) &&
           !std::filesystem::exists(Paths::kCounterDir);
  }));
}

}  // namespace
}  // namespace QELO
