#include <signal.h>
#include <unistd.h>

#include "tests/unit/platform/TaskFixture.h"

using ARDO::Task;
using ARDO::TaskUtil;

namespace {

constexpr char kWeekAgo[] = "(unixepoch()-604800-60)*1000";
constexpr char kAlmostAWeekAgo[] = "(unixepoch()-604800+60)*1000";

class TaskClearing : public TaskTest {
 protected:
  static void FinishedAt(const std::string& id, const std::string& time) {
    EXPECT_TRUE(Task("alice", id).finish(false));
    Sql("UPDATE tasks SET finished=" + time + " WHERE task='" + id + "'");
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
  EXPECT_TRUE(Exists(old)) << "only the making of a record clears others";
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

TEST_F(TaskClearing, TaskThatDiedUnseenEndsAndGoesAWeekLater) {
  const std::string id = NewTask("alice");
  const pid_t worker = StartSleeper([&] { Task("alice", id).setCreatePid(getpid()); });
  Kill(worker);
  Sql(std::string("UPDATE tasks SET created=") + kWeekAgo);
  const std::string ended = "SELECT ending FROM tasks WHERE task='" + id + "'";
  EXPECT_EQ(Sql(ended), "0");
  NewTask("alice");
  EXPECT_EQ(Sql(ended), "2");
  EXPECT_TRUE(Exists(id));
  Sql(std::string("UPDATE tasks SET finished=") + kWeekAgo + " WHERE finished IS NOT NULL");
  NewTask("alice");
  EXPECT_FALSE(Exists(id));
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
