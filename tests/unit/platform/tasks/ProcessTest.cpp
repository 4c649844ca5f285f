#include <linux/sched.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

using namespace QELO;
using ARDO::Task;

namespace {

constexpr char kGone[] =
    R"({"error":{"code":117,"errors":{"reason":"The task's process ended without finishing it."}},)"
    R"("success":false})";
constexpr char kNotStarted[] =
    R"({"error":{"code":117,"errors":{"reason":)"
    R"("The process that should do the task did not start."}},"success":false})";
constexpr char kRestarted[] =
    R"({"error":{"code":117,"errors":{"reason":)"
    R"("The machine was restarted before the task was finished."}},"success":false})";

class TaskProcesses : public TaskTest {
 protected:
  void SetUp() override {
    TaskTest::SetUp();
    id_ = NewTask("alice");
  }

  static std::string Body(const std::string& id) {
    return JsonHelper::toString(Task("alice", id).getProperty("body"));
  }

  /// A process that is recorded as the task's.
  pid_t StartWorker() {
    const pid_t child = StartSleeper();
    EXPECT_TRUE(Task("alice", id_).setCreatePid(child));
    return child;
  }

  /// A child with this process id. @return -1 when the kernel does not let us choose
  static pid_t ForkAs(pid_t pid) {
    clone_args arguments{};
    arguments.exit_signal = SIGCHLD;
    arguments.set_tid = reinterpret_cast<uintptr_t>(&pid);
    arguments.set_tid_size = 1;
    const long child = syscall(SYS_clone3, &arguments, sizeof arguments);
    if (child == 0) {
      pause();
      _exit(0);
    }
    return static_cast<pid_t>(child);
  }

  std::string id_;
};

TEST_F(TaskProcesses, RecordedOneThatRunsIsTold) {
  const pid_t worker = StartWorker();
  EXPECT_EQ(Task("alice", id_).getCreatePid(), worker);
  EXPECT_FALSE(Task("alice", id_).isFinished());
  EXPECT_EQ(NumberOf(Task("alice", id_).getProperty("body")), 1);
  Kill(worker);
}

TEST_F(TaskProcesses, OneThatRecordsItselfIsTold) {
  const pid_t worker =
      StartSleeper([&] { EXPECT_TRUE(Task("alice", id_).setCreatePid(getpid())); });
  EXPECT_EQ(Task("alice", id_).getCreatePid(), worker);
  Kill(worker);
}

TEST_F(TaskProcesses, OneWhoseNameLooksLikeTheEndOfANameIsTold) {
  const pid_t worker = StartSleeper([&] { prctl(PR_SET_NAME, ") Z 1 (x) Z 9"); });
  EXPECT_TRUE(Task("alice", id_).setCreatePid(worker));
  EXPECT_EQ(Task("alice", id_).getCreatePid(), worker);
  EXPECT_FALSE(Task("alice", id_).isFinished());
  Kill(worker);
}

TEST_F(TaskProcesses, NumbersOfNoProcessAreNotRecorded) {
  const pid_t ended = StartSleeper();
  Kill(ended);
  for (const int pid : {0, -1, -getpid(), static_cast<int>(ended), 0x7fffffff}) {
    EXPECT_FALSE(Task("alice", id_).setCreatePid(pid)) << pid;
  }
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
}

TEST_F(TaskProcesses, KilledOneEndsItsTaskWithAnErrorBody) {
  const pid_t worker = StartWorker();
  const Task before("alice", id_);
  EXPECT_FALSE(before.isFinished());
  Kill(worker);
  EXPECT_EQ(before.getCreatePid(), 0) << "a process's life is looked at when it is asked for";
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_EQ(Body(id_), kGone);
  EXPECT_EQ(Sql("SELECT ending||'/'||(finished IS NOT NULL) FROM tasks"), "2/1")
      << "the finding is stored";
}

TEST_F(TaskProcesses, OneThatEndedButWasNotWaitedForIsGone) {
  const pid_t worker = StartWorker();
  EXPECT_EQ(kill(worker, SIGKILL), 0);
  siginfo_t info{};
  EXPECT_EQ(waitid(P_PID, static_cast<id_t>(worker), &info, WEXITED | WNOWAIT), 0);
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_EQ(Body(id_), kGone);
  EXPECT_FALSE(Task("alice", id_).setCreatePid(worker));
  EXPECT_EQ(waitpid(worker, nullptr, 0), worker);
}

TEST_F(TaskProcesses, DeathBeforeAnyResultGivesABodyToo) {
  const std::string id = NewId();
  const pid_t worker = StartSleeper([&] {
    EXPECT_TRUE(Task("alice", id).setProperty("info", 1));
    EXPECT_TRUE(Task("alice", id).setCreatePid(getpid()));
  });
  EXPECT_FALSE(Task("alice", id).hasProperty("body"));
  Kill(worker);
  EXPECT_TRUE(Task("alice", id).hasProperty("body"));
  EXPECT_EQ(Body(id), kGone);
  EXPECT_EQ(Task("alice", id).getProperty("info"), Json::Value(1));
}

TEST_F(TaskProcesses, EndAfterFinishingLeavesTheResult) {
  const pid_t worker = StartSleeper([&] {
    Task task("alice", id_);
    EXPECT_TRUE(task.setCreatePid(getpid()));
    EXPECT_TRUE(task.setProperty("body", Number(5)));
    EXPECT_TRUE(task.finish(false));
  });
  Kill(worker);
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), R"({"n":5})");
}

// The reader gives way to the process at any moment, so that the process finishes and ends between
// the reader's look at the record and its look at the process too.
TEST_F(TaskProcesses, EndRightAfterFinishingIsNeverTakenForDeath) {
  EXPECT_EQ(InChild([] {
              cpu_set_t one;
              CPU_ZERO(&one);
              CPU_SET(sched_getcpu(), &one);
              sched_setaffinity(0, sizeof one, &one);
              for (int i = 0; i < 60; ++i) {
                const std::string id = NewTask("alice");
                const pid_t worker = StartSleeper([] {});
                Task task("alice", id);
                task.setCreatePid(worker);
                const pid_t finisher = fork();
                if (finisher == 0) {
                  Task own("alice", id);
                  own.reload();
                  usleep(static_cast<useconds_t>(2000 + i * 37 % 1000));
                  own.finish(false);
                  kill(worker, SIGKILL);
                  _exit(0);
                }
                const sched_param lowest{};
                sched_setscheduler(0, SCHED_IDLE, &lowest);
                do {
                  task.reload();
                } while (!task.isFinished());
                sched_setscheduler(0, SCHED_OTHER, &lowest);
                waitpid(worker, nullptr, 0);
                waitpid(finisher, nullptr, 0);
                if (NumberOf(task.getProperty("body")) != 1) {
                  return 1;
                }
              }
              return 0;
            }),
            0);
}

// Whoever stops a task kills its process first, and others may look between the two.
TEST_F(TaskProcesses, FinishingATaskThatWasFoundDeadGivesItsResultBack) {
  Kill(StartWorker());
  EXPECT_EQ(Body(id_), kGone);
  EXPECT_TRUE(Task("alice", id_).finish(false));
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), R"({"n":1})");
}

TEST_F(TaskProcesses, NumberWithAnotherStartTimeIsAStranger) {
  const pid_t worker = StartWorker();
  Sql("UPDATE tasks SET start=start-1");
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), kGone);
  Kill(worker);
}

TEST_F(TaskProcesses, NumberThatWasGivenToAnotherProcessIsAStranger) {
  const pid_t worker = StartWorker();
  Kill(worker);
  usleep(50'000);  // start times count in hundredths of a second
  const pid_t stranger = ForkAs(worker);
  if (stranger < 0) {
    GTEST_SKIP() << "the kernel lets root alone choose process ids";
  }
  ASSERT_EQ(stranger, worker);
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), kGone);
  Kill(stranger);
}

TEST_F(TaskProcesses, OfAnEarlierBootAreGone) {
  const pid_t worker = StartWorker();
  Sql("UPDATE tasks SET boot='3c9c0ff8-0000-4000-8000-000000000000'");
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), kRestarted);
  Kill(worker);
}

TEST_F(TaskProcesses, RestartBeforeAProcessWasRecordedEndsTheTask) {
  Sql("UPDATE tasks SET boot='3c9c0ff8-0000-4000-8000-000000000000'");
  EXPECT_EQ(Body(id_), kRestarted);
}

TEST_F(TaskProcesses, RestartLeavesFinishedTasksAlone) {
  EXPECT_TRUE(Task("alice", id_).finish(false));
  Sql("UPDATE tasks SET boot='3c9c0ff8-0000-4000-8000-000000000000'");
  EXPECT_EQ(Body(id_), R"({"n":1})");
}

TEST_F(TaskProcesses, OneThatIsNotRecordedMayStillBeStarting) {
  Sql("UPDATE tasks SET born=born-29000");
  EXPECT_FALSE(Task("alice", id_).isFinished());
  EXPECT_EQ(Task("alice", id_).getCreatePid(), 0);
  EXPECT_EQ(Body(id_), R"({"n":1})");
}

TEST_F(TaskProcesses, OneThatIsNotRecordedInTimeDidNotStart) {
  Sql("UPDATE tasks SET born=born-31000");
  EXPECT_TRUE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), kNotStarted);
}

TEST_F(TaskProcesses, OneThatIsRecordedLateBringsTheTaskBack) {
  Sql("UPDATE tasks SET born=born-31000");
  EXPECT_EQ(Body(id_), kNotStarted);
  const pid_t worker = StartWorker();
  EXPECT_FALSE(Task("alice", id_).isFinished());
  EXPECT_EQ(Body(id_), R"({"n":1})");
  Kill(worker);
}

TEST_F(TaskProcesses, RecordingOneLeavesAFinishedTaskFinished) {
  EXPECT_TRUE(Task("alice", id_).finish(false));
  const pid_t worker = StartWorker();
  EXPECT_TRUE(Task("alice", id_).isFinished());
  Kill(worker);
}

class TaskProcessUsers : public TaskUserTest {};

TEST_F(TaskProcessUsers, EndIsToldThoughItCannotBeStored) {
  const std::string id = TextFrom(kAlice, [] {
    const std::string made = NewTask("alice");
    const pid_t worker = StartSleeper();
    Task("alice", made).setCreatePid(worker);
    Kill(worker);
    return made;
  });
  ASSERT_EQ(chmod(Store(kAlice, "tasks.db").c_str(), S_IRUSR), 0);
  EXPECT_EQ(TextFrom(kAlice,
                     [&] {
                       const Task task("alice", id);
                       return JsonHelper::toString(task.getProperty("body")) +
                              (task.isFinished() ? " finished" : "");
                     }),
            std::string(kGone) + " finished");
  EXPECT_EQ(Sql(kAlice, "SELECT ending FROM tasks"), "0");
}

// The user may write what he likes to his own store; that must not make root kill for him.
TEST_F(TaskProcessUsers, RecordInAUsersStoreStandsForThatUsersProcessesAlone) {
  const std::string id = TextFrom(kAlice, [] { return NewTask("alice"); });
  ASSERT_NE(id, "");
  const pid_t roots = StartSleeper();
  EXPECT_TRUE(Task("alice", id).setCreatePid(roots));
  EXPECT_EQ(Task("alice", id).getCreatePid(), 0);
  EXPECT_FALSE(Task("alice", id).isFinished());
  const pid_t alices = StartSleeper([] {
    if (setresuid(kAlice, kAlice, kAlice) != 0) {
      _exit(1);
    }
  });
  EXPECT_TRUE(Task("alice", id).setCreatePid(alices));
  EXPECT_EQ(Task("alice", id).getCreatePid(), alices);
  Kill(roots);
  Kill(alices);
}

TEST_F(TaskProcessUsers, RecordInRootsStoreStandsForAnyProcess) {
  const std::string id = NewTask("alice");
  const pid_t worker = StartSleeper([] {
    if (setresuid(kAlice, kAlice, kAlice) != 0) {
      _exit(1);
    }
  });
  EXPECT_TRUE(Task("alice", id).setCreatePid(worker));
  EXPECT_EQ(Task("alice", id).getCreatePid(), worker);
  Kill(worker);
}

}  // namespace
