#include <errno.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <syslog.h>

#include <cstring>

#include "tests/unit/runner/RunnerFixture.h"
#include "webapi/runner/APIRunnerPrivate.h"

namespace QELO {
namespace {

class ProcessName : public RunnerTest {
 protected:
  static std::string ThreadName() {
    char name[17] = {};
    prctl(PR_GET_NAME, name);
    return name;
  }
  /// Argument text in an area of its own, as main()'s stands.
  char area[64] = "/usr/bin/some-long-program-name";
  char* arguments[2] = {area, nullptr};
};

TEST_F(ProcessName, NamesIdentityArgumentAndThreadAfterTheCall) {
  TestRunner tested;
  tested.SetArgs(1, arguments);
  MakeRequest("QELO.Test.Call", 2, "run");
  EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(SyslogCapture::Identity(), "unit_runner_QELO.Test.Call_2_run");
  EXPECT_STREQ(area, "unit_runner_QELO.Test.Call_2_r");  // cut to the room there was
  EXPECT_EQ(ThreadName(), "QELO.Test.Call_");            // the kernel keeps 15 bytes
}

TEST_F(ProcessName, SyslogIsReopenedWithProcessIdAndConsoleForEachCall) {
  TestRunner tested;
  SyslogCapture::Clear();
  for (const char* method : {"first", "second"}) {
    MakeRequest("QELO.Test.Call", 2, method);
    tested.SetProcessName(request.get(), response.get());
  }
  ASSERT_EQ(SyslogCapture::Openings().size(), 2u);
  for (int call = 0; call < 2; ++call) {
    const SyslogCapture::Opening& opening = SyslogCapture::Openings().at(call);
    EXPECT_EQ(opening.options, LOG_PID | LOG_CONS);
    EXPECT_EQ(opening.facility, 0);
    EXPECT_EQ(opening.closings, call + 1);  // each closes the one before
  }
  EXPECT_EQ(SyslogCapture::Openings()[1].identity, "unit_runner_QELO.Test.Call_2_second");
}

TEST_F(ProcessName, DestructionReopensSyslogInTheSameWay) {
  { TestRunner tested; }
  ASSERT_FALSE(SyslogCapture::Openings().empty());
  EXPECT_EQ(SyslogCapture::Openings().back().options, LOG_PID | LOG_CONS);
  EXPECT_EQ(SyslogCapture::Openings().back().facility, 0);
}

TEST_F(ProcessName, EmptyApiIs101) {
  TestRunner tested;
  MakeRequest("", 1, "run");
  EXPECT_FALSE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 101);
}

TEST_F(ProcessName, IdentityHoldsNothingThatALogTakesForItsEnd) {
  TestRunner tested;
  MakeRequest("x[1]: LoginSession.cpp:1 login failed from 192.0.2.7: y\n", 2, "run");
  EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(SyslogCapture::Identity(),
            "unit_runner_x?1???LoginSession.cpp?1?login?failed?from?192.0.2.7??y?_2_run");
}

TEST_F(ProcessName, IdentityIsCutTo1023Bytes) {
  TestRunner tested;
  MakeRequest("Q." + std::string(2000, 'a'), 1, "run");
  EXPECT_TRUE(tested.SetProcessName(request.get(), response.get()));
  EXPECT_EQ(SyslogCapture::Identity().size(), 1023u);
}

TEST_F(ProcessName, DestructionGivesTheNameBack) {
  {
    TestRunner tested;
    tested.SetArgs(1, arguments);
    MakeRequest("QELO.Test.Call", 2, "run");
    tested.SetProcessName(request.get(), response.get());
  }
  EXPECT_EQ(SyslogCapture::Identity(), "unit_runner");
  EXPECT_STREQ(area, "unit_runner");
  EXPECT_EQ(ThreadName(), "unit_runner");
}

TEST_F(ProcessName, NothingIsWrittenWithoutArguments) {
  APIRunnerPrivate tested(nullptr);
  tested.SetArgv0("x");  // nowhere to write to
  tested.SetArgs(0, arguments);
  tested.SetArgv0("x");
  EXPECT_STREQ(area, "/usr/bin/some-long-program-name");
  tested.SetArgs(1, arguments);
  tested.SetArgv0("x");
  EXPECT_STREQ(area, "x");
  EXPECT_EQ(tested.GetProcName(), "unit_runner");
  EXPECT_EQ(tested.GetOrigProcName(), "unit_runner");
}

/// What a process that was started under this name is called, before and after it hands over its
/// arguments, and from the start on: "before after original".
std::string namesOfProcess(const std::string& started, char** arguments) {
  int ends[2];
  EXPECT_EQ(pipe(ends), 0);
  const pid_t child = fork();
  if (child == 0) {
    // The real argument area, which the system shows as the command line.
    const size_t room = strlen(program_invocation_name);
    memset(program_invocation_name, 0, room);
    memcpy(program_invocation_name, started.data(), std::min(room, started.size()));
    APIRunnerPrivate tested(nullptr);
    std::string names = tested.GetProcName() + " ";
    tested.SetArgs(1, arguments);
    names += tested.GetProcName() + " " + tested.GetOrigProcName();
    _exit(write(ends[1], names.data(), names.size()) > 0 ? 0 : 1);
  }
  close(ends[1]);
  char names[256] = {};
  EXPECT_GT(read(ends[0], names, sizeof names - 1), 0);
  close(ends[0]);
  waitpid(child, nullptr, 0);
  return names;
}

TEST_F(ProcessName, OneWithTwoUnderscoresIsCutAtItsFirstOnceTheArgumentsAreKnown) {
  EXPECT_EQ(namesOfProcess("web__call", arguments), "web__call web web__call");
  EXPECT_EQ(namesOfProcess("/bin/a_b__c", arguments), "a_b__c a a_b__c");
  EXPECT_EQ(namesOfProcess("__c", arguments), "__c  __c");
}

TEST_F(ProcessName, OneWithoutTwoUnderscoresInARowIsKept) {
  EXPECT_EQ(namesOfProcess("web_call_x", arguments), "web_call_x web_call_x web_call_x");
}

TEST_F(ProcessName, OfAStartedProcessEndsAtItsFirstBlank) {
  EXPECT_EQ(namesOfProcess("/bin/web call__x", arguments), "web web web");
}

}  // namespace
}  // namespace QELO
