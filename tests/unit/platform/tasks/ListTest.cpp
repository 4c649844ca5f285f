#include <chrono>
#include <initializer_list>
#include <set>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

class TaskIds : public TaskTest {};
class TaskLists : public TaskTest {
 protected:
  static std::string List(const std::string& owner, const char* prefix) {
    return JsonHelper::toString(TaskMgr(owner).getAllTaskId(prefix));
  }
  static std::string Expected(std::initializer_list<std::string> ids) {
    Json::Value list(Json::arrayValue);
    for (const std::string& id : ids) {
      list.append(id);
    }
    return JsonHelper::toString(list);
  }
};

TEST_F(TaskIds, StartWithThePrefixAndEndWithTheEffectiveUser) {
  const std::string id = TaskUtil::getUniqueID("alice", "copy_");
  const std::string end = "." + std::to_string(geteuid());
  EXPECT_EQ(id.size(), 5 + 43 + end.size());
  EXPECT_EQ(id.substr(0, 5), "copy_");
  EXPECT_EQ(id.substr(id.size() - end.size()), end);
}

TEST_F(TaskIds, AreNeverTheSame) {
  std::set<std::string> ids;
  for (int i = 0; i < 10'000; ++i) {
    ids.insert(TaskUtil::getUniqueID("alice", ""));
  }
  EXPECT_EQ(ids.size(), 10'000U);
}

TEST_F(TaskIds, OfTwoChildrenOfOneProcessDiffer) {
  const auto make = [] { return TaskUtil::getUniqueID("alice", ""); };
  EXPECT_NE(TextFrom(geteuid(), make), TextFrom(geteuid(), make));
}

TEST_F(TaskIds, WithAnUnusablePrefixAreNotMadeAndThatIsLogged) {
  int refused = 0;
  for (const std::string& prefix :
       {std::string("a/b"), std::string("a b"), std::string("a\0", 2), std::string("\xc3\xa4"),
        std::string("a'"), std::string(129, 'p')}) {
    EXPECT_EQ(TaskUtil::getUniqueID("alice", prefix), "");
    EXPECT_EQ(SyslogCapture::Count("a task id's prefix holds up to 128 letters"), ++refused);
  }
  EXPECT_NE(TaskUtil::getUniqueID("alice", std::string(128, 'p')), "");
}

TEST_F(TaskIds, ThatAreMalformedNameNoRecord) {
  const std::string id = NewTask("alice", "");
  const std::string secret = id.substr(0, 43);
  const std::string user = std::to_string(geteuid());
  const std::string wrong[] = {
      "",
      "/",
      "../",
      "..",
      ".",
      std::string(1, '\0'),
      std::string(10'000, 'x'),
      std::string(10'000, 'x') + id,
      secret,
      secret + ".",
      secret + ".-1",
      secret + ".+" + user,
      secret + ".0" + user,
      secret + ". " + user,
      secret + "." + user + " ",
      secret + "." + user + std::string(1, '\0'),
      secret + "." + user + "/../" + user,
      secret + ".4294967295",
      secret + ".4294967296",
      secret + ".99999999999999999999",
      "../" + id,
      "a/" + id,
      "%" + id,
      secret.substr(1) + "." + user,
      "=" + secret.substr(1) + "." + user,
  };
  for (const std::string& text : wrong) {
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", text)) << text;
    EXPECT_FALSE(Task("alice", text).setProperty("body", Number(2))) << text;
    EXPECT_FALSE(Task("alice", text).finish(true)) << text;
    EXPECT_FALSE(Task("alice", text).waitForDataReady("body", 0)) << text;
  }
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 1U);
  EXPECT_EQ(CountFiles("var/lib/webapi/tasks"), 1);
}

TEST_F(TaskLists, AreOldestFirst) {
  const std::string first = NewTask("alice", "b_");
  const std::string second = NewTask("alice", "c_");
  const std::string third = NewTask("alice", "a_");
  EXPECT_EQ(List("alice", nullptr), Expected({first, second, third}));
  EXPECT_EQ(List("alice", ""), Expected({first, second, third}));
  EXPECT_TRUE(Task("alice", first).setProperty("body", Number(2)));
  EXPECT_EQ(List("alice", nullptr), Expected({first, second, third}));
}

TEST_F(TaskLists, OfAnOwnerHoldHisTasksAlone) {
  const std::string alices = NewTask("alice");
  const std::string bobs = NewTask("bob");
  EXPECT_EQ(List("alice", nullptr), Expected({alices}));
  EXPECT_EQ(List("bob", nullptr), Expected({bobs}));
  EXPECT_EQ(List("admin", nullptr), "[]");
}

TEST_F(TaskLists, WithAPrefixTakeItLiterally) {
  const std::string plain = NewTask("alice", "copy_1");
  const std::string other = NewTask("alice", "copyX1");
  const std::string longer = NewTask("alice", "copy_1.more");
  NewTask("alice", "Copy_1");
  EXPECT_EQ(List("alice", "copy_1"), Expected({plain, longer}));
  EXPECT_EQ(List("alice", "copy"), Expected({plain, other, longer}));
  EXPECT_EQ(List("alice", plain.c_str()), Expected({plain}));
  for (const char* prefix : {"copy%", "copy*", "c?py", "\x7f", "\xff", "' OR 1=1"}) {
    EXPECT_EQ(List("alice", prefix), "[]") << prefix;
  }
}

TEST_F(TaskLists, WithoutAStoreAreEmptyAndMakeNone) {
  EXPECT_EQ(List("alice", nullptr), "[]");
  EXPECT_EQ(CountFiles("var/lib/webapi/tasks"), 0);
  EXPECT_EQ(SyslogCapture::Count("task store"), 0);
}

TEST_F(TaskLists, LeaveOutRowsWhoseIdCannotBeOne) {
  const std::string id = NewTask("alice");
  Sql("INSERT INTO tasks(owner, task, created, born, boot) VALUES('alice', '../etc', 1, 0, ''),"
      " ('alice', '" +
      std::string(43, 'x') + ".4711', 1, 0, '')");
  EXPECT_EQ(List("alice", nullptr), Expected({id}));
}

TEST_F(TaskLists, OfUnendedTasksLeaveOutThoseThatAreKnownToHaveEnded) {
  const std::string running = NewTask("alice", "a_");
  const std::string finished = NewTask("alice", "a_");
  const std::string other = NewTask("alice", "b_");
  NewTask("bob", "a_");
  EXPECT_TRUE(Task("alice", finished).finish(false));
  const auto list = [](const char* prefix) {
    return JsonHelper::toString(TaskMgr("alice").getUnendedTaskId(prefix));
  };
  EXPECT_EQ(list(nullptr), Expected({running, other}));
  EXPECT_EQ(list("a_"), Expected({running}));
  EXPECT_EQ(JsonHelper::toString(TaskMgr("carol").getUnendedTaskId("")), "[]");
}

TEST_F(TaskLists, OfTenThousandComeAtOnce) {
  const std::string id = NewTask("alice", "mine_");
  Sql("WITH RECURSIVE n(i) AS (SELECT 10000 UNION ALL SELECT i+1 FROM n WHERE i<19999)"
      "INSERT INTO tasks(owner, task, created, born, boot) SELECT 'alice', i||'" +
      id.substr(5) + "', i, 0, '' FROM n");
  const auto before = std::chrono::steady_clock::now();
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 10'001U);
  EXPECT_EQ(List("alice", "mine_"), Expected({id}));
  EXPECT_EQ(List("alice", "12345"), Expected({"12345" + id.substr(5)}));
  EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::seconds(2));
}

}  // namespace
