#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

class PollingList : public PollingTest {
 protected:
  void SetUp() override {
    PollingTest::SetUp();
    for (const char* owner : {"alice", "bob", "@users", "@administrators"}) {
      Record(owner, "a1", "{}");
      Record(owner, "b2", "{}");
    }
  }

  /// @return the error, 0 for success
  int List(const std::string& prefix, const std::string& groups) {
    return polling->List(prefix, Parse(groups), out) ? 0 : polling->GetError();
  }

  Json::Value out;
};

TEST_F(PollingList, WithoutRequestIs502) {
  polling->SetRequest(nullptr);
  EXPECT_EQ(List("", R"(["user"])"), 502);
  EXPECT_EQ(SyslogCapture::Count("unknown request"), 1);
}

TEST_F(PollingList, OfNoListOfGroupsIs502) {
  EXPECT_EQ(List("", R"("user")"), 502);
  EXPECT_EQ(List("", "null"), 502);
  EXPECT_EQ(List("", R"({"user":1})"), 502);
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 3);
}

TEST_F(PollingList, OfUserAndEveryoneHasFullIds) {
  ASSERT_EQ(List("", R"(["user","everyone"])"), 0);
  EXPECT_EQ(Text(out), R"({"everyone":["@users/a1","@users/b2"],"user":["alice/a1","alice/b2"]})");
}

TEST_F(PollingList, OfAdminIs505ForOthers) {
  EXPECT_EQ(List("", R"(["admin"])"), 505);
  EXPECT_FALSE(out.isMember("admin"));
}

TEST_F(PollingList, OfAdminHasTheAdministratorsTasks) {
  Login("admin", true);
  ASSERT_EQ(List("", R"(["admin","user"])"), 0);
  EXPECT_EQ(Text(out["admin"]), R"(["@administrators/a1","@administrators/b2"])");
  EXPECT_TRUE(out["user"].isNull());
}

TEST_F(PollingList, OfAnUnknownGroupIs503) {
  EXPECT_EQ(List("", R"(["bob"])"), 503);
  EXPECT_EQ(List("", R"([""])"), 503);
  EXPECT_EQ(List("", R"([{"user":1}])"), 503);
}

TEST_F(PollingList, WithPrefixHasOnlyThatIds) {
  ASSERT_EQ(List("b", R"(["user"])"), 0);
  EXPECT_EQ(Text(out), R"({"user":["alice/b2"]})");
  EXPECT_EQ(tasks->calls.back(), "getAllTaskId(alice, b)");
}

TEST_F(PollingList, WithoutPrefixAsksForAll) {
  ASSERT_EQ(List("", R"(["user"])"), 0);
  EXPECT_EQ(tasks->calls.back(), "getAllTaskId(alice, null)");
}

TEST_F(PollingList, WithANulInThePrefixHasNone) {
  for (const std::string& prefix : {std::string(1, '\0'), std::string("b\0", 2)}) {
    ASSERT_EQ(List(prefix, R"(["user"])"), 0);
    EXPECT_TRUE(out["user"].isNull()) << Text(out);
    int count = -1;
    EXPECT_TRUE(polling->CountRunning(prefix, count));
    EXPECT_EQ(count, 0);
  }
}

TEST_F(PollingList, OfABusyStoreIs504) {
  tasks->busy = true;
  EXPECT_EQ(List("", R"(["user"])"), 504);
  int count = -1;
  EXPECT_FALSE(polling->CountRunning("", count));
  EXPECT_EQ(polling->GetError(), 504);
  EXPECT_EQ(count, -1);
}

TEST_F(PollingList, OfNoGroupsLeavesTheOutputAnObject) {
  out = 7;
  ASSERT_EQ(List("", "[]"), 0);
  EXPECT_EQ(Text(out), "{}");
}

TEST_F(PollingList, KeepsWhatTheOutputHeld) {
  out["before"] = 1;
  ASSERT_EQ(List("", R"(["user"])"), 0);
  EXPECT_EQ(out["before"], 1);
}

TEST_F(PollingList, OfWhoIsNotLoggedInIsNull) {
  Login("", false);
  Record("", "1", "{}");
  ASSERT_EQ(List("", R"(["user"])"), 0);
  EXPECT_TRUE(out["user"].isNull());
}

TEST_F(PollingList, CountOfRunningLeavesOutEndedForeignAndOtherTasks) {
  FakeTask::Get().Change("alice", "a1", false, [](Json::Value& task) { task["finished"] = true; });
  const pid_t gone = Fork([] {});
  EndOf(gone);
  Record("alice", "b3", "{}", gone);
  Record("alice", "b4", "{}", Sleeper());
  int count = -1;
  EXPECT_TRUE(polling->CountRunning("b", count));
  EXPECT_EQ(count, 2) << "b2 has no process yet, b4 has one";
  EXPECT_TRUE(polling->CountRunning("a", count));
  EXPECT_EQ(count, 0);
}

TEST_F(PollingList, CountOfRunningIsNoneAndNoErrorForAUserWithoutTasks) {
  Login("carol", false);
  int count = -1;
  EXPECT_TRUE(polling->CountRunning("", count));
  EXPECT_EQ(count, 0);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(PollingList, CountOfRunningWithoutRequestIs502) {
  polling->SetRequest(nullptr);
  int count = -1;
  EXPECT_FALSE(polling->CountRunning("", count));
  EXPECT_EQ(polling->GetError(), 502);
  EXPECT_EQ(count, -1);
}

class PollingFullIds : public PollingTest {
 protected:
  std::string Convert(const std::string& owner, const Json::Value& ids) const {
    return Text(APIPollingPrivate(request.get(), nullptr).ConverToFullTaskId(owner, ids));
  }
};

TEST_F(PollingFullIds, OfNoOwnerOrNoIdsIsNull) {
  EXPECT_EQ(Convert("", "1"), "null");
  EXPECT_EQ(Convert("alice", Json::Value()), "null");
  EXPECT_EQ(Convert("alice", Json::Value(Json::arrayValue)), "null");
  EXPECT_EQ(Convert("alice", Json::Value(Json::objectValue)), "null");
}

TEST_F(PollingFullIds, OfATextIsOne) {
  EXPECT_EQ(Convert("alice", "1"), R"("alice/1")");
}

TEST_F(PollingFullIds, OfAnArrayIsAnArray) {
  EXPECT_EQ(Convert("@users", Parse(R"(["1","2"])")), R"(["@users/1","@users/2"])");
}

TEST_F(PollingFullIds, OfAnObjectKeepsTheNames) {
  EXPECT_EQ(Convert("alice", Parse(R"({"x":"1","y":"2"})")), R"({"x":"alice/1","y":"alice/2"})");
}

TEST_F(PollingFullIds, OfAnythingElseIsNull) {
  EXPECT_EQ(Convert("alice", 7), "null");
  EXPECT_EQ(Convert("alice", true), "null");
}

}  // namespace
}  // namespace QELO
