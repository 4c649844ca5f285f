#include <unistd.h>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

class TaskRecords : public TaskTest {
 protected:
  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// Arrays in arrays, so many.
  static Json::Value Nested(int depth) {
    Json::Value value(Json::arrayValue);
    for (int i = 1; i < depth; ++i) {
      Json::Value outer(Json::arrayValue);
      outer.append(value);
      value = outer;
    }
    return value;
  }
};

TEST_F(TaskRecords, UpdateMakesTheRecordForAllToRead) {
  const std::string id = NewId();
  Task task("alice", id);
  task.beginUpdate();
  EXPECT_TRUE(task.setProperty("info", Parse(R"({"api":"A","version":2})")));
  EXPECT_TRUE(task.setProperty("auto_remove", true));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_TRUE(task.endUpdate());

  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id));
  const Task other("alice", id);
  EXPECT_EQ(JsonHelper::toString(other.getProperty("info")), R"({"api":"A","version":2})");
  EXPECT_TRUE(other.getBoolProperty("auto_remove", false));
  EXPECT_EQ(other.getTaskId(), id);
}

TEST_F(TaskRecords, PropertyOutsideOfAnUpdateIsStoredAtOnce) {
  const std::string id = NewId();
  EXPECT_TRUE(Task("alice", id).setProperty("body", Number(7)));
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 7);
}

TEST_F(TaskRecords, LaterUpdateReplacesItsPropertiesAndKeepsTheOthers) {
  const std::string id = NewTask("alice");
  Task task("alice", id);
  EXPECT_TRUE(task.setProperty("extra", "kept"));
  EXPECT_TRUE(task.setProperty("body", Number(2)));
  EXPECT_EQ(NumberOf(task.getProperty("body")), 2);
  EXPECT_EQ(task.getProperty("extra"), Json::Value("kept"));
}

TEST_F(TaskRecords, ValuesOfEveryKindComeBackAsTheyWere) {
  Task task("alice", NewId());
  for (const char* text : {"null", "true", "-5", "1.25", "\"\"", "\"\\u0000 \\\" \xc3\xa4\"", "[]",
                           "{}", R"({"a":[1,{"b":null}],"c":"d"})"}) {
    EXPECT_TRUE(task.setProperty("value", Parse(text)));
    EXPECT_TRUE(task.hasProperty("value"));
    EXPECT_EQ(task.getProperty("value"), Parse(text)) << text;
  }
}

TEST_F(TaskRecords, UpdateWithOneValueThatNestsTooDeepStoresNothing) {
  const std::string id = NewTask("alice");
  Task task("alice", id);
  EXPECT_TRUE(task.setProperty("deep", Nested(JsonHelper::kMaxDepth)));
  EXPECT_EQ(task.getProperty("deep"), Nested(JsonHelper::kMaxDepth));
  task.beginUpdate();
  EXPECT_TRUE(task.setProperty("body", Number(2)));
  EXPECT_FALSE(task.setProperty("deep", Nested(JsonHelper::kMaxDepth + 1)));
  EXPECT_FALSE(task.endUpdate());
  EXPECT_EQ(SyslogCapture::Count("a task's property is not stored: its value nests too deep"), 1);
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 1);
}

TEST_F(TaskRecords, UpdateWithOneValueThatIsTooLargeStoresNothingAndIsLogged) {
  const std::string id = NewTask("alice");
  Task task("alice", id);
  task.beginUpdate();
  EXPECT_TRUE(task.setProperty("body", Number(2)));
  EXPECT_TRUE(task.setProperty("large", std::string(17 << 20, 'x')));
  EXPECT_FALSE(task.endUpdate());
  EXPECT_EQ(SyslogCapture::Count("string or blob too big"), 1);
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 1);
  EXPECT_FALSE(Task("alice", id).hasProperty("large"));
  EXPECT_TRUE(task.setProperty("body", Number(3)));
}

TEST_F(TaskRecords, UpdateThatMakesTheRecordTooLargeStoresNothingAndIsLogged) {
  const std::string id = NewTask("alice");
  Task task("alice", id);
  const std::string part(15 << 20, 'x');
  for (int i = 0; i < 4; ++i) {
    EXPECT_TRUE(task.setProperty("part" + std::to_string(i), part));
  }
  EXPECT_FALSE(task.setProperty("part4", part));
  EXPECT_EQ(SyslogCapture::Count("a record would become too large"), 1);
  EXPECT_FALSE(task.hasProperty("part4"));
  EXPECT_EQ(task.getProperty("part3"), Json::Value(part));
}

TEST_F(TaskRecords, PropertyNamesThatAreEmptyOrTooLongOrHoldNulAreRefused) {
  Task task("alice", NewTask("alice"));
  EXPECT_FALSE(task.setProperty("", 1));
  EXPECT_FALSE(task.setProperty(std::string("a\0b", 3), 1));
  EXPECT_FALSE(task.setProperty(std::string(257, 'n'), 1));
  EXPECT_EQ(SyslogCapture::Count("a task's property is not stored: its name cannot be one"), 3);
  EXPECT_TRUE(task.setProperty(std::string(256, 'n'), 1));
}

TEST_F(TaskRecords, UpdateWithoutPropertiesStoresNothing) {
  const std::string id = NewId();
  Task task("alice", id);
  EXPECT_FALSE(task.endUpdate());
  task.beginUpdate();
  EXPECT_FALSE(task.endUpdate());
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
}

TEST_F(TaskRecords, UpdateThatIsNotEndedStoresNothing) {
  const std::string id = NewTask("alice");
  {
    Task task("alice", id);
    task.beginUpdate();
    EXPECT_TRUE(task.setProperty("body", Number(2)));
  }
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 1);
}

TEST_F(TaskRecords, MissingRecordAnswersWithDefaults) {
  const std::string id = NewId();
  Task task("alice", id);
  EXPECT_FALSE(task.reload());
  EXPECT_TRUE(task.getProperty("body").isNull());
  EXPECT_FALSE(task.hasProperty("body"));
  EXPECT_TRUE(task.getBoolProperty("auto_remove", true));
  EXPECT_FALSE(task.isFinished());
  EXPECT_FALSE(task.finish(false));
  EXPECT_FALSE(task.finish(true));
  EXPECT_FALSE(task.remove());
  EXPECT_FALSE(task.setCreatePid(getpid()));
  EXPECT_EQ(task.getCreatePid(), 0);
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_EQ(SyslogCapture::Count("task store"), 0);
}

TEST_F(TaskRecords, ReadsComeFromTheLastLoad) {
  const std::string id = NewTask("alice");
  Task reader("alice", id);
  EXPECT_EQ(NumberOf(reader.getProperty("body")), 1);
  EXPECT_TRUE(Task("alice", id).setProperty("body", Number(2)));
  EXPECT_EQ(NumberOf(reader.getProperty("body")), 1);
  EXPECT_TRUE(reader.reload());
  EXPECT_EQ(NumberOf(reader.getProperty("body")), 2);
}

TEST_F(TaskRecords, FinishMarksTheTaskAndKeepsItsResult) {
  const std::string id = NewTask("alice");
  EXPECT_FALSE(Task("alice", id).isFinished());
  EXPECT_TRUE(Task("alice", id).finish(false));
  EXPECT_TRUE(Task("alice", id).isFinished());
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 1);
  EXPECT_TRUE(Task("alice", id).finish(false));
}

TEST_F(TaskRecords, FinishWithRemovalLeavesNoRecord) {
  const std::string id = NewTask("alice");
  EXPECT_TRUE(Task("alice", id).finish(true));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_EQ(Sql("SELECT count(*) FROM properties"), "0");
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 0U);
}

TEST_F(TaskRecords, RemovedRecordIsNotMadeAgainByAnUpdate) {
  const std::string id = NewTask("alice");
  Task of_its_process("alice", id);
  EXPECT_TRUE(Task("alice", id).remove());
  EXPECT_FALSE(Task("alice", id).remove());
  EXPECT_FALSE(of_its_process.setProperty("body", Number(2)));
  EXPECT_FALSE(Task("alice", id).setProperty("body", Number(2)));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_EQ(SyslogCapture::Count("task store"), 0);
}

TEST_F(TaskRecords, OwnersMayHoldAnyText) {
  const std::string owners[] = {"o'r; DROP TABLE tasks;--",
                                "@users",
                                "%",
                                "..",
                                "a/b",
                                "\xc3\xa4\xff",
                                std::string("a\0b", 3),
                                std::string(1024, 'o')};
  for (const std::string& owner : owners) {
    const std::string id = NewTask(owner);
    EXPECT_TRUE(TaskUtil::checkTaskExists(owner, id)) << owner;
    EXPECT_EQ(TaskMgr(owner).getAllTaskId(nullptr).size(), 1U) << owner;
  }
  EXPECT_EQ(TaskMgr("a").getAllTaskId(nullptr).size(), 0U);
}

TEST_F(TaskRecords, OwnersThatAreEmptyOrTooLongHaveNoTasks) {
  const std::string id = NewId();
  EXPECT_FALSE(Task("", id).setProperty("body", 1));
  EXPECT_FALSE(Task(std::string(1025, 'o'), id).setProperty("body", 1));
}

TEST_F(TaskRecords, TaskOfAnotherOwnerIsNotTheSame) {
  const std::string id = NewTask("alice");
  EXPECT_FALSE(TaskUtil::checkTaskExists("bob", id));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alic", id));
  EXPECT_FALSE(Task("bob", id).finish(true));
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id));
}

}  // namespace
