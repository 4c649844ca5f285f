// The sessions of the processes that a runner works in: its own and that of the callbacks.

#include <sys/wait.h>

#include <array>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class ProcessSession : public RunnerTest {};

TEST_F(ProcessSession, OfARunnerIsLedByTheProcessThatBuiltIt) {
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    const bool inherited = getsid(0) != getpid();
    const TestRunner tested;
    _exit(inherited && getsid(0) == getpid() && getpgrp() == getpid() ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

/// Writes the process's id and its session's into the descriptor that the argument points to.
void writeSession(void* argument) {
  const std::array<pid_t, 2> ids{getpid(), getsid(0)};
  [[maybe_unused]] const ssize_t count = write(*static_cast<int*>(argument), &ids, sizeof ids);
}

TEST_F(ProcessSession, OfCallbacksIsTheirOwn) {
  MakeRequest("QELO.Test.Call", 1, "run");
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  response->SetCallbackFunc(writeSession, &ends[1]);
  EXPECT_TRUE(TestRunner().HandleCallback(response.get()));
  close(ends[1]);
  std::array<pid_t, 2> ids{};
  EXPECT_EQ(read(ends[0], &ids, sizeof ids), static_cast<ssize_t>(sizeof ids));
  close(ends[0]);
  EXPECT_EQ(wait(nullptr), ids[0]);
  EXPECT_EQ(ids[1], ids[0]);
  EXPECT_NE(ids[1], getsid(0));
}

}  // namespace
}  // namespace QELO
