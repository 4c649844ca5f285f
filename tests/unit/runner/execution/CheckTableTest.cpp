// How an entry is found in a library's tables, and whose check function is asked.

#include <fcntl.h>
#include <sys/wait.h>

#include <csignal>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class CheckTable : public RunnerTest {
 protected:
  /// Runs "run" of the library with the odd tables in this version, with these parameters.
  bool Run(int version, const std::string& params = "{}") {
    WriteDescription(Description("odd_checks"));
    MakeRequest("QELO.Test.Call", version, "run", Parse(params));
    return TestRunner().Process(request.get(), response.get());
  }
};

TEST_F(CheckTable, EntryWithoutAFunctionEndsTheSearchAndPasses) {
  EXPECT_TRUE(Run(1));
  EXPECT_EQ(Data(), Json::Value("ran"));
}

TEST_F(CheckTable, FirstOfTwoEntriesCountsInBothTables) {
  EXPECT_TRUE(Run(2));
  EXPECT_EQ(Data(), Json::Value("ran"));
}

TEST_F(CheckTable, EntryThatDiffersInOneThingIsAnothers) {
  EXPECT_TRUE(Run(3));
  EXPECT_EQ(Data(), Json::Value("ran"));
}

TEST_F(CheckTable, TerminatingEntrysFunctionIsAskedWhenThereIsNoOther) {
  EXPECT_FALSE(Run(3, R"({"refuse": true})"));
  EXPECT_EQ(response->GetError(), 445);
  EXPECT_TRUE(Run(2, R"({"refuse": true})"));
}

TEST_F(CheckTable, AnyNumberButZeroPasses) {
  EXPECT_TRUE(Run(2));  // its check answers -1
  EXPECT_EQ(response->GetError(), 0);
}

TEST_F(CheckTable, LibraryWhoseConstructorThrowsTakesItsOwnProcess) {
  const pid_t child = fork();
  if (child == 0) {
    signal(SIGABRT, SIG_DFL);
    dup2(open("/dev/null", O_WRONLY | O_CLOEXEC), STDERR_FILENO);  // the run-time library's words
    ProcessPlugin("throwing_constructor");
    _exit(0);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), SIGABRT);
  EXPECT_TRUE(ProcessPlugin("state"));  // ours is none the worse
}

}  // namespace
}  // namespace QELO
