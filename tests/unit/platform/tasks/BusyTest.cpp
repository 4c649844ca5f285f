// Stores that somebody holds: nobody else waits for long, and none is told as missing.

#include <fcntl.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/file.h>
#include <unistd.h>

#include <chrono>
#include <functional>
#include <thread>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;

namespace {

class TaskBusy : public TaskUserTest {
 protected:
  void SetUp() override {
    TaskUserTest::SetUp();
    if (IsSkipped()) {
      return;
    }
    alices = TextFrom(kAlice, [] { return NewTask("@users"); });
    bobs = TextFrom(kBob, [] { return NewTask("@users"); });
  }

  void TearDown() override {
    if (holder_ > 0) {
      Kill(holder_);
    }
  }

  /// A process of alice's that has done so and goes on.
  void Hold(const std::function<void()>& lock) {
    holder_ = StartSleeper([&] {
      if (setresgid(kAlice, kAlice, kAlice) == 0 && setresuid(kAlice, kAlice, kAlice) == 0) {
        lock();
      }
    });
  }

  /// Locks all of a file of alice's store.
  static void LockFile(const char* name) {
    const int file = open(Store(kAlice, name).c_str(), O_RDWR | O_CLOEXEC);
    struct flock all {};
    all.l_type = F_WRLCK;
    fcntl(file, F_SETLK, &all);
  }

  static long MillisecondsOf(const std::function<void()>& body) {
    const auto start = std::chrono::steady_clock::now();
    body();
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() -
                                                                 start)
        .count();
  }

  /// What root sees of everybody's tasks while alice's store is held.
  void ExpectBobsAloneSoon() {
    TaskMgr tasks("@users");
    Json::Value ids;
    SyslogCapture::Clear();
    EXPECT_LT(MillisecondsOf([&] { ids = tasks.getAllTaskId(nullptr); }), 1000);
    ASSERT_EQ(ids.size(), 1u);
    EXPECT_EQ(ids[0], bobs);
    EXPECT_FALSE(tasks.isIncomplete());
    EXPECT_GE(SyslogCapture::Count("cannot use the task store"), 1);
    Task task("@users", alices);
    EXPECT_LT(MillisecondsOf([&] { EXPECT_FALSE(task.reload()); }), 1000);
    EXPECT_TRUE(task.isBusy());
  }

  std::string alices;
  std::string bobs;

 private:
  pid_t holder_ = 0;
};

TEST_F(TaskBusy, IndexOfTheLogThatItsUserHoldsKeepsNobodyElseWaiting) {
  Hold([] { LockFile("tasks.db-shm"); });
  ExpectBobsAloneSoon();
}

TEST_F(TaskBusy, DatabaseThatItsUserHoldsKeepsNobodyElseWaiting) {
  Hold([] { LockFile("tasks.db"); });
  ExpectBobsAloneSoon();
}

TEST_F(TaskBusy, DatabaseInExclusiveModeKeepsNobodyElseWaiting) {
  Hold([] {
    sqlite3* database = nullptr;
    sqlite3_open(Store(kAlice, "tasks.db").c_str(), &database);
    sqlite3_exec(database, "PRAGMA locking_mode=EXCLUSIVE; BEGIN EXCLUSIVE", nullptr, nullptr,
                 nullptr);
  });
  ExpectBobsAloneSoon();
}

TEST_F(TaskBusy, DirectoryAndDatabaseThatItsUserHoldsKeepNobodyElseWaiting) {
  Hold([] {
    flock(open(Store(kAlice).c_str(), O_RDONLY | O_CLOEXEC), LOCK_EX);
    LockFile("tasks.db");
  });
  ExpectBobsAloneSoon();
}

TEST_F(TaskBusy, LeaseOnTheDatabaseKeepsNobodyElseWaiting) {
  Hold([] {
    signal(SIGIO, SIG_IGN);  // told that somebody waits, it goes on
    const int file = open(Store(kAlice, "tasks.db").c_str(), O_RDONLY | O_CLOEXEC);
    fcntl(file, F_SETLEASE, F_WRLCK);
  });
  ExpectBobsAloneSoon();
}

TEST_F(TaskBusy, StoreThatIsHeldForAMomentIsWaitedFor) {
  Hold([] {
    static int file = open(Store(kAlice, "tasks.db-shm").c_str(), O_RDWR | O_CLOEXEC);
    LockFile("tasks.db-shm");
    std::thread([] {
      usleep(30'000);
      close(file);  // any descriptor of the file's takes the process's locks along
    }).detach();
  });
  TaskMgr tasks("@users");
  EXPECT_EQ(tasks.getAllTaskId(nullptr).size(), 2u);
}

TEST_F(TaskBusy, OwnersTaskIsToldAsBusy) {
  const std::string own = TextFrom(kAlice, [] { return NewTask("alice"); });
  Hold([] { LockFile("tasks.db-shm"); });
  Task task("alice", own);
  EXPECT_LT(MillisecondsOf([&] { EXPECT_FALSE(task.reload()); }), 8000);
  EXPECT_TRUE(task.isBusy());
  EXPECT_FALSE(task.isFinished());
  TaskMgr tasks("alice");
  EXPECT_TRUE(tasks.getAllTaskId(nullptr).empty());
  EXPECT_TRUE(tasks.isIncomplete());
}

TEST_F(TaskBusy, TaskThatIsMissingIsNotTheSame) {
  Task task("alice", NewId());
  EXPECT_FALSE(task.reload());
  EXPECT_FALSE(task.isBusy());
}

}  // namespace
