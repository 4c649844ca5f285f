#include <signal.h>
#include <sys/inotify.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <fstream>
#include <functional>

#include "tests/unit/platform/tasks/Fixture.h"

using ARDO::Task;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

namespace {

constexpr int kLongLimit = 2000;       // 20 s in the limit's unit
constexpr milliseconds kSoon{10'000};  // far below the limit, even on a busy machine

class TaskWaits : public TaskTest {
 protected:
  void SetUp() override {
    TaskTest::SetUp();
    id_ = NewTask("alice");
  }

  /// A child that pauses and then runs the body.
  static pid_t After(milliseconds pause, const std::function<void()>& body) {
    const pid_t child = fork();
    if (child == 0) {
      usleep(static_cast<useconds_t>(pause.count() * 1000));
      body();
      _exit(0);
    }
    return child;
  }

  /// A child that opens the store, pauses, and sets the property to the time.
  pid_t StartSetter(const std::string& name) const {
    return After(milliseconds(0), [&] {
      Task task("alice", id_);
      task.reload();
      usleep(130'000);
      task.setProperty(name, Now());
    });
  }

  static milliseconds Since(steady_clock::time_point start) {
    return std::chrono::duration_cast<milliseconds>(steady_clock::now() - start);
  }

  /// The clock is one for all processes of a boot.
  static std::string Now() {
    return std::to_string(steady_clock::now().time_since_epoch().count());
  }

  std::string id_;
};

TEST_F(TaskWaits, PropertyThatIsThereIsReadAtOnce) {
  EXPECT_TRUE(Task("alice", id_).waitForDataReady("body", 0));
  EXPECT_TRUE(Task("alice", id_).waitForDataReady("body", -1));
}

TEST_F(TaskWaits, WaitReadsTheRecord) {
  Task task("alice", id_);
  EXPECT_EQ(NumberOf(task.getProperty("body")), 1);
  EXPECT_TRUE(Task("alice", id_).setProperty("body", Number(2)));
  EXPECT_TRUE(task.waitForDataReady("body", 0));
  EXPECT_EQ(NumberOf(task.getProperty("body")), 2);
}

TEST_F(TaskWaits, LimitCountsHundredthsOfASecond) {
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", id_).waitForDataReady("task_run", 25));
  EXPECT_GE(Since(start), milliseconds(250));
  EXPECT_LT(Since(start), kSoon);
}

TEST_F(TaskWaits, RecordThatNobodyMadeIsWaitedForUntilTheLimit) {
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", NewId()).waitForDataReady("task_run", 20));
  EXPECT_GE(Since(start), milliseconds(200));
}

TEST_F(TaskWaits, RecordThatIsMadeMeanwhileIsSeen) {
  const std::string id = NewId();
  const pid_t child =
      After(milliseconds(50), [&] { Task("alice", id).setProperty("task_run", true); });
  const auto start = steady_clock::now();
  EXPECT_TRUE(Task("alice", id).waitForDataReady("task_run", kLongLimit));
  EXPECT_LT(Since(start), kSoon);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

// The looks that are made without an event stand a tenth of a second apart: the property is set in
// the midst between two of them, and at least one of many times seen long before the next. Opening
// the store can wake a waiter too, so the child has it open already.
TEST_F(TaskWaits, PropertyWakesTheWaiterAtOnce) {
  int64_t least = INT64_MAX;
  for (int i = 0; i < 10; ++i) {
    const std::string name = "set" + std::to_string(i);
    const pid_t child = StartSetter(name);
    Task task("alice", id_);
    EXPECT_TRUE(task.waitForDataReady(name, kLongLimit));
    const int64_t set = std::stoll(task.getProperty(name).asString());
    least = std::min(least, steady_clock::now().time_since_epoch().count() - set);
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
  }
  EXPECT_LT(least / 1'000'000, 30);
}

TEST_F(TaskWaits, NoChangeIsMissedWhenItComesWithTheWait) {
  for (int i = 0; i < 200; ++i) {
    const std::string name = "set" + std::to_string(i);
    const pid_t child = After(milliseconds(0), [&] { Task("alice", id_).setProperty(name, 1); });
    const auto start = steady_clock::now();
    ASSERT_TRUE(Task("alice", id_).waitForDataReady(name, kLongLimit)) << i;
    ASSERT_LT(Since(start), kSoon);
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
  }
}

TEST_F(TaskWaits, WithoutAWatchThePropertyIsSeenToo) {
  int instances = 0;
  std::ifstream("/proc/sys/fs/inotify/max_user_instances") >> instances;
  ASSERT_GT(instances, 0);
  EXPECT_EQ(InChild([&] {
              int taken = 0;  // other programs give some back meanwhile
              while (inotify_init1(IN_CLOEXEC) >= 0) {
                if (++taken > instances) {
                  return 2;
                }
              }
              const pid_t child = After(milliseconds(50),
                                        [&] { Task("alice", id_).setProperty("task_run", true); });
              const auto start = steady_clock::now();
              const bool there = Task("alice", id_).waitForDataReady("task_run", kLongLimit);
              waitpid(child, nullptr, 0);
              return there && Since(start) < kSoon ? 0 : 1;
            }),
            0);
}

TEST_F(TaskWaits, FinishedTaskIsNotWaitedFor) {
  const pid_t child = After(milliseconds(50), [&] { Task("alice", id_).finish(false); });
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", id_).waitForDataReady("task_run", kLongLimit));
  EXPECT_LT(Since(start), kSoon);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

TEST_F(TaskWaits, RemovedRecordIsNotWaitedFor) {
  const pid_t child = After(milliseconds(50), [&] { Task("alice", id_).finish(true); });
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", id_).waitForDataReady("task_run", kLongLimit));
  EXPECT_LT(Since(start), kSoon);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

TEST_F(TaskWaits, RecordThatWasRemovedBeforeTheWaitIsNotWaitedFor) {
  const std::string id = NewId();
  Task task("alice", id);
  EXPECT_TRUE(task.setProperty("info", 1));
  EXPECT_TRUE(Task("alice", id).finish(true));
  const auto start = steady_clock::now();
  EXPECT_FALSE(task.waitForDataReady("task_run", kLongLimit));
  EXPECT_LT(Since(start), kSoon);
}

TEST_F(TaskWaits, DeadProcessIsNotWaitedFor) {
  const pid_t worker = StartSleeper([&] { Task("alice", id_).setCreatePid(getpid()); });
  const pid_t killer = After(milliseconds(50), [&] { kill(worker, SIGKILL); });
  const auto start = steady_clock::now();
  Task task("alice", id_);
  EXPECT_FALSE(task.waitForDataReady("task_run", kLongLimit));
  EXPECT_LT(Since(start), kSoon);
  EXPECT_TRUE(task.isFinished());
  EXPECT_EQ(waitpid(killer, nullptr, 0), killer);
  EXPECT_EQ(waitpid(worker, nullptr, 0), worker);
}

TEST_F(TaskWaits, SignalDoesNotEndAWait) {
  struct sigaction former {};
  struct sigaction action {};
  action.sa_handler = [](int) {};
  ASSERT_EQ(sigaction(SIGUSR1, &action, &former), 0);
  const pid_t parent = getpid();
  const pid_t child = After(milliseconds(50), [&] { kill(parent, SIGUSR1); });
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", id_).waitForDataReady("task_run", 30));
  EXPECT_GE(Since(start), milliseconds(300));
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
  EXPECT_EQ(sigaction(SIGUSR1, &former, nullptr), 0);
}

TEST_F(TaskWaits, ChangeOfTheRecordIsSeen) {
  Task task("alice", id_);
  EXPECT_EQ(NumberOf(task.getProperty("body")), 1);
  const pid_t child =
      After(milliseconds(50), [&] { Task("alice", id_).setProperty("body", Number(2)); });
  const auto start = steady_clock::now();
  EXPECT_TRUE(task.waitForChange(kLongLimit));
  EXPECT_LT(Since(start), kSoon);
  EXPECT_EQ(NumberOf(task.getProperty("body")), 2);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

TEST_F(TaskWaits, ChangeBetweenTheLastReadAndTheWaitIsSeenAtOnce) {
  Task task("alice", id_);
  EXPECT_TRUE(task.reload());
  EXPECT_TRUE(Task("alice", id_).setProperty("body", Number(2)));
  EXPECT_TRUE(task.waitForChange(0));
  EXPECT_FALSE(task.waitForChange(0));
}

TEST_F(TaskWaits, ChangeOfAnotherRecordIsNone) {
  const std::string other = NewTask("alice");
  const pid_t child =
      After(milliseconds(50), [&] { Task("alice", other).setProperty("body", Number(2)); });
  const auto start = steady_clock::now();
  EXPECT_FALSE(Task("alice", id_).waitForChange(30));
  EXPECT_GE(Since(start), milliseconds(300));
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

TEST_F(TaskWaits, EndRemovalAndDeathAreChanges) {
  Task task("alice", id_);
  EXPECT_TRUE(task.reload());
  EXPECT_TRUE(Task("alice", id_).finish(false));
  EXPECT_TRUE(task.waitForChange(0));
  EXPECT_TRUE(Task("alice", id_).remove());
  EXPECT_TRUE(task.waitForChange(0));
  EXPECT_FALSE(task.waitForChange(0));

  const std::string id = NewTask("alice");
  const pid_t worker = StartSleeper([&] { Task("alice", id).setCreatePid(getpid()); });
  Task killed("alice", id);
  EXPECT_TRUE(killed.reload());
  Kill(worker);
  EXPECT_TRUE(killed.waitForChange(0));
  EXPECT_TRUE(killed.isFinished());
}

}  // namespace
