// How workers end, and what is counted of it.

#include "programs/webapi-server/workers/Roster.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>

#include "programs/webapi-server/worker/Remains.h"
#include "programs/webapi-server/workers/Ending.h"

namespace QELO {
namespace {

class WorkerRoster : public ::testing::Test {
 protected:
  /// Adds a worker that lives as `life` does, until its end.
  void Run(const std::function<void(CallClock&)>& life) {
    CallClock clock;
    const pid_t pid = fork();
    if (pid == 0) {
      life(clock);
      _exit(0);
    }
    roster.Add(pid, "0 somebody", std::move(clock));
    EXPECT_EQ(figures.now, 1U);
    int status = 0;
    waitpid(pid, &status, 0);
    EXPECT_TRUE(roster.TakeEnded(pid, status));
    EXPECT_EQ(figures.now, 0U);
  }
  static std::function<void(CallClock&)> With(int status) {
    return [status](CallClock&) { _exit(status); };
  }

  WorkerLimits limits{.call = std::chrono::seconds(1)};
  Metrics::Staying figures;
  Roster roster{limits, figures};
};

TEST_F(WorkerRoster, CountsTheEndsThatAWorkerTells) {
  Run(With(static_cast<int>(Ending::kIdle)));
  Run(With(static_cast<int>(Ending::kCalls)));
  Run(With(static_cast<int>(Ending::kTold)));
  Run(With(static_cast<int>(Ending::kFailed)));
  Run(With(static_cast<int>(Ending::kRemains) + static_cast<int>(Remains::Left::kThread)));
  Run(With(static_cast<int>(Ending::kRemains) + static_cast<int>(Remains::Left::kMemory)));
  EXPECT_EQ(figures.idle, 1U);
  EXPECT_EQ(figures.calls, 1U);
  EXPECT_EQ(figures.other, 2U);
  EXPECT_EQ(figures.remains, 1U);
  EXPECT_EQ(figures.memory, 1U);
  EXPECT_EQ(figures.started, 6U);
  EXPECT_TRUE(roster.IsEmpty());
}

TEST_F(WorkerRoster, WhatEndsWithinACall_HasCrashedWhateverItTells) {
  Run([](CallClock& clock) {
    clock.Begin();
    _exit(static_cast<int>(Ending::kIdle));
  });
  Run([](CallClock& clock) {
    clock.Begin();
    raise(SIGKILL);
  });
  Run([](CallClock& clock) {
    clock.Begin();
    clock.End();
    raise(SIGTERM);
  });
  Run(With(200));
  EXPECT_EQ(figures.crash, 4U);
  EXPECT_EQ(figures.timeOut, 0U);
}

TEST_F(WorkerRoster, AKillWhenTheTimeIsOver_IsATimeOut) {
  Run([](CallClock& clock) {
    clock.Begin();
    usleep(1'000'000);
    raise(SIGKILL);
  });
  EXPECT_EQ(figures.timeOut, 1U);
  EXPECT_EQ(figures.crash, 0U);
}

TEST_F(WorkerRoster, OneAccountHasAQuarter) {
  limits.workers = 8;
  Roster few(limits, figures);
  few.Add(1 << 30, "0 a", CallClock());
  EXPECT_TRUE(few.HasRoomFor("0 a"));
  few.Add((1 << 30) + 1, "0 a", CallClock());
  EXPECT_FALSE(few.HasRoomFor("0 a"));
  EXPECT_TRUE(few.HasRoomFor("0 b"));
}

TEST_F(WorkerRoster, KnowsItsOwnAlone) {
  EXPECT_FALSE(roster.TakeEnded(1 << 30, 0));
}

}  // namespace
}  // namespace QELO
