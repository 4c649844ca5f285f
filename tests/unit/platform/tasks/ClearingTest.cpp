#include <signal.h>
#include <time.h>
#include <unistd.h>

#include <chrono>
#include <string>

#include "tests/unit/platform/DatabaseProgram.h"
#include "tests/unit/platform/tasks/Fixture.h"

using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

const std::string kEnding = "SELECT ending FROM tasks";
constexpr char kWeekAgo[] = "(unixepoch()-604800-60)*1000";
constexpr char kAlmostAWeekAgo[] = "(unixepoch()-604800+60)*1000";

class TaskClearing : public TaskTest {
 protected:
  static void FinishedAt(const std::string& id, const std::string& time) {
    EXPECT_TRUE(Task("alice", id).finish(false));
    Sql("UPDATE tasks SET finished=" + time + " WHERE task='" + id + "'");
  }
  /// A task whose process is gone, which nobody has seen.
  static std::string NewDeadTask() {
    const std::string id = NewTask("alice");
    Kill(StartSleeper([&] { Task("alice", id).setCreatePid(getpid()); }));
    return id;
  }
  static bool Exists(const std::string& id) { return TaskUtil::checkTaskExists("alice", id); }
};

TEST_F(TaskClearing, TaskThatFinishedAWeekAgoGoesWhenAnotherIsMade) {
  const std::string old = NewTask("alice");
  const std::string recent = NewTask("alice");
  FinishedAt(old, kWeekAgo);
  FinishedAt(recent, kAlmostAWeekAgo);
  EXPECT_TRUE(Exists(old));
  EXPECT_TRUE(Task("alice", recent).setProperty("body", Number(2)));
  EXPECT_TRUE(Exists(old)) << "a change clears no others";
  NewTask("alice");
  EXPECT_FALSE(Exists(old));
  EXPECT_TRUE(Exists(recent));
  EXPECT_EQ(Sql("SELECT count(*) FROM properties"), "2");
}

TEST_F(TaskClearing, AgeIsASetting) {
  const std::string id = NewTask("alice");
  FinishedAt(id, "(unixepoch()-100)*1000");
  Set({{"task_keep_seconds", "110"}});
  NewTask("alice");
  EXPECT_TRUE(Exists(id));
  Set({{"task_keep_seconds", "90"}});
  NewTask("alice");
  EXPECT_FALSE(Exists(id));
}

TEST_F(TaskClearing, SettingThatIsNoAgeLeavesTheWeek) {
  const std::string id = NewTask("alice");
  FinishedAt(id, kAlmostAWeekAgo);
  for (const char* value : {"-1", "soon", "99999999999", ""}) {
    Set({{"task_keep_seconds", value}});
    NewTask("alice");
    EXPECT_TRUE(Exists(id)) << value;
  }
  Set({{"task_keep_seconds", "0"}});
  NewTask("alice");
  EXPECT_FALSE(Exists(id));
}

TEST_F(TaskClearing, TaskThatRunsIsKeptHoweverOldItIs) {
  const std::string id = NewTask("alice");
  const pid_t worker = StartSleeper([&] { Task("alice", id).setCreatePid(getpid()); });
  Sql(std::string("UPDATE tasks SET created=0, born=0"));
  NewTask("alice");
  EXPECT_TRUE(Exists(id));
  EXPECT_FALSE(Task("alice", id).isFinished());
  Kill(worker);
}

TEST_F(TaskClearing, TaskThatDiedUnseenCountsFromItsLastSignOfLife) {
  const std::string id = NewDeadTask();
  Sql(std::string("UPDATE tasks SET created=0, changed=") + kAlmostAWeekAgo);
  EXPECT_EQ(Sql(kEnding), "0");
  NewTask("alice");
  EXPECT_EQ(Sql(kEnding + (" WHERE task='" + id + "'")), "2");
  EXPECT_TRUE(Exists(id));
  Sql(std::string("UPDATE tasks SET finished=finished-120000 WHERE finished IS NOT NULL"));
  NewTask("alice");
  EXPECT_FALSE(Exists(id));
}

TEST_F(TaskClearing, TaskThatDiedUnseenAWeekAgoGoesAtOnce) {
  const std::string id = NewDeadTask();
  Sql(std::string("UPDATE tasks SET created=0, changed=") + kWeekAgo);
  NewTask("alice");
  EXPECT_FALSE(Exists(id));
}

TEST_F(TaskClearing, TaskThatARestartEndedCountsFromTheRestart) {
  const std::string id = NewTask("alice");
  Sql("UPDATE tasks SET created=0, changed=0, boot='another'");
  NewTask("alice");
  EXPECT_TRUE(Exists(id)) << "it may have worked until the machine was started anew";
  timespec up{};
  clock_gettime(CLOCK_MONOTONIC, &up);
  const std::string started = std::to_string(up.tv_sec);
  EXPECT_EQ(Sql("SELECT abs(finished/1000-(unixepoch()-" + started +
                "))<10 FROM tasks WHERE task='" + id + "'"),
            "1");
}

TEST_F(TaskClearing, TasksThatRunDoNotHideLaterOnesThatDied) {
  const std::string running = NewTask("alice");
  const pid_t worker = StartSleeper([&] { Task("alice", running).setCreatePid(getpid()); });
  const std::string dead = NewDeadTask();
  Sql("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i+1 FROM n WHERE i<60)"
      "INSERT INTO tasks(owner, task, created, born, boot, pid, start)"
      " SELECT 'alice', 'running'||i, i, 0, boot, pid, start FROM n, tasks WHERE task='" +
      running + "'");
  Sql("UPDATE tasks SET created=1000, changed=0 WHERE task='" + dead + "'");
  int made = 0;
  while (Sql("SELECT count(*) FROM tasks WHERE task='" + dead + "'") == "1" && made < 200) {
    NewTask("alice");
    ++made;
  }
  EXPECT_LT(made, 200);
  EXPECT_EQ(Sql("SELECT count(*) FROM tasks WHERE task LIKE 'running%' AND ending=0"), "60");
  Kill(worker);
}

TEST_F(TaskClearing, ListClearsToo) {
  const std::string old = NewTask("alice");
  const std::string dead = NewDeadTask();
  const std::string recent = NewTask("alice");
  FinishedAt(old, kWeekAgo);
  Sql("UPDATE tasks SET created=0, changed=0 WHERE task='" + dead + "'");
  const Json::Value ids = TaskMgr("alice").getAllTaskId(nullptr);
  ASSERT_EQ(ids.size(), 1U);
  EXPECT_EQ(ids[0], recent);
  EXPECT_EQ(Sql("SELECT count(*) FROM tasks"), "1");
}

TEST_F(TaskClearing, ListOfTasksThatRunWritesNothing) {
  const std::string id = NewTask("alice");
  const pid_t worker = StartSleeper([&] { Task("alice", id).setCreatePid(getpid()); });
  Sql("UPDATE tasks SET created=0, changed=0");
  const std::string version = Sql("PRAGMA data_version; SELECT version FROM tasks");
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 1U);
  EXPECT_EQ(Sql("PRAGMA data_version; SELECT version FROM tasks"), version);
  Kill(worker);
}

TEST_F(TaskClearing, ListDoesNotWaitForWriters) {
  const std::string old = NewTask("alice");
  FinishedAt(old, kWeekAgo);
  {
    const DatabaseProgram writer(Store(geteuid(), "tasks.db"), "BEGIN IMMEDIATE");
    ASSERT_EQ(writer.Error(), "");
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 1U);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(3));
  }
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 0U);
}

TEST_F(TaskClearing, MakingARecordClearsABoundedNumber) {
  NewTask("alice");
  Sql("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i+1 FROM n WHERE i<250)"
      "INSERT INTO tasks(owner, task, created, born, boot, ending, finished)"
      " SELECT 'alice', i, 0, 0, '', 1, i FROM n");
  NewTask("alice");
  EXPECT_EQ(Sql("SELECT count(*), min(finished) FROM tasks WHERE ending=1"), "150");
  EXPECT_EQ(Sql("SELECT min(finished) FROM tasks WHERE ending=1"), "101") << "the oldest go first";
  NewTask("alice");
  NewTask("alice");
  EXPECT_EQ(Sql("SELECT count(*) FROM tasks WHERE ending=1"), "0");
}

TEST_F(TaskClearing, RemovedIdsAreRememberedForADay) {
  const std::string recent = NewTask("alice");
  const std::string old = NewTask("alice");
  EXPECT_TRUE(Task("alice", recent).remove());
  EXPECT_TRUE(Task("alice", old).remove());
  Sql("UPDATE removed SET time=time-86400000-60000 WHERE task='" + old + "'");
  NewTask("alice");
  EXPECT_EQ(Sql("SELECT task FROM removed"), recent);
}

}  // namespace
