#include <climits>
#include <cstdio>

#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

constexpr char kFirst[] = R"({"success":true,"data":1})";
constexpr char kSecond[] = R"({"success":true,"data":2})";

class PollingWait : public PollingTest {
 protected:
  /// @return the error, 0 for success
  int Wait(const std::string& id, const std::string& state, int seconds) {
    return polling->Wait(id, state, seconds, out) ? 0 : polling->GetError();
  }

  /// The state of a task as it is now.
  std::string StateOf(const std::string& id) {
    EXPECT_EQ(Wait(id, "", 0), 0);
    return JsonHelper::asString(out["state"]);
  }

  /// Another process changes the record, a tenth of a second from now.
  void ChangeLater(const std::function<void()>& change) {
    Fork([&] {
      usleep(100000);
      change();
    });
  }

  Json::Value out;
};

TEST_F(PollingWait, RefusesAsStatusDoes) {
  Record("bob", "1", kFirst);
  EXPECT_EQ(Wait("", "", 5), 502);
  EXPECT_EQ(Wait("alice", "", 5), 503);
  EXPECT_EQ(Wait("bob/1", "", 5), 503);
  EXPECT_EQ(Wait("alice/none", "", 5), 508);
  polling->SetRequest(nullptr);
  EXPECT_EQ(Wait("alice/1", "", 5), 502);
}

TEST_F(PollingWait, OfNoTimeAnswersAtOnce) {
  Record("alice", "1", kFirst);
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", "", 0), 0);
  ASSERT_EQ(Wait("alice/1", "", -5), 0);
  EXPECT_LT(watch.Milliseconds(), 400);
  EXPECT_EQ(out["data"], 1);
  EXPECT_EQ(out["finish"], false);
}

TEST_F(PollingWait, AnswersWhenTheBodyChanges) {
  Record("alice", "1", kFirst);
  ChangeLater([this] { Record("alice", "1", kSecond); });
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", "", 20), 0);
  EXPECT_EQ(out["data"], 2);
  EXPECT_LT(watch.Milliseconds(), 5000);
}

TEST_F(PollingWait, FromAnOlderStateAnswersAtOnce) {
  Record("alice", "1", kFirst);
  const std::string state = StateOf("alice/1");
  Record("alice", "1", kSecond);
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", state, 20), 0);
  EXPECT_LT(watch.Milliseconds(), 1000);
  EXPECT_EQ(out["data"], 2);
  EXPECT_NE(out["state"], state);
}

TEST_F(PollingWait, FromThePresentStateWaits) {
  Record("alice", "1", kFirst);
  const std::string state = StateOf("alice/1");
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", state, 1), 0);
  EXPECT_GE(watch.Milliseconds(), 950);
  EXPECT_EQ(out["state"], state);
}

TEST_F(PollingWait, IsNotEndedByChangesThatAStatusDoesNotShow) {
  Record("alice", "1", kFirst);
  ChangeLater([] {
    FakeTask::Get().Change("alice", "1", false,
                           [](Json::Value& record) { record["properties"]["other"] = 1; });
  });
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", "", 1), 0);
  EXPECT_GE(watch.Milliseconds(), 950);
}

TEST_F(PollingWait, AnswersWhenTheTaskEnds) {
  Record("alice", "1", kFirst);
  ChangeLater([] {
    FakeTask::Get().Change("alice", "1", false,
                           [](Json::Value& record) { record["finished"] = true; });
  });
  ASSERT_EQ(Wait("alice/1", "", 20), 0);
  EXPECT_EQ(out["finish"], true);
  EXPECT_EQ(out["data"], 1);
}

TEST_F(PollingWait, OfAnEndedTaskAnswersAtOnce) {
  Record("alice", "1", kFirst);
  FakeTask::Get().Change("alice", "1", false,
                         [](Json::Value& record) { record["finished"] = true; });
  const std::string state = StateOf("alice/1");
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", state, 20), 0);
  EXPECT_LT(watch.Milliseconds(), 1000);
}

TEST_F(PollingWait, NoticesTheDeathOfTheProcess) {
  const pid_t worker = Sleeper();
  Record("alice", "1", kFirst, worker);
  ChangeLater([worker] { kill(worker, SIGKILL); });
  const Stopwatch watch;
  ASSERT_EQ(Wait("alice/1", "", 20), 0);
  EXPECT_EQ(out["finish"], true);
  EXPECT_LT(watch.Milliseconds(), 3000);
}

TEST_F(PollingWait, OfATaskThatIsRemovedMeanwhileIs508) {
  Record("alice", "1", kFirst);
  ChangeLater([this] { tasks->Put("alice", "1", Json::Value()); });
  EXPECT_EQ(Wait("alice/1", "", 20), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/1]"), 1);
  EXPECT_TRUE(out.isNull());
}

TEST_F(PollingWait, OfATaskThatRemovesItselfBeforeItIsReadIs508AtOnce) {
  Record("alice", "1", kFirst);
  RemoveMeanwhile("checkTaskExists", "1");
  const Stopwatch watch;
  EXPECT_EQ(Wait("alice/1", "", 20), 508);
  EXPECT_LT(watch.Milliseconds(), 5000);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/1]"), 1);
}

TEST_F(PollingWait, AboveTheLongestIsCut) {
  for (const int seconds : {61, 1'000'000, INT_MAX}) {
    Record("alice", "1", kFirst);
    tasks->calls.clear();
    ChangeLater([this] { Record("alice", "1", kSecond); });
    ASSERT_EQ(Wait("alice/1", "", seconds), 0);
    ASSERT_FALSE(tasks->calls.empty());
    int limit = 0;
    ASSERT_EQ(sscanf(tasks->calls.back().c_str(), "waitForChange(%d)", &limit), 1);
    EXPECT_LE(limit, 60 * 100) << seconds;
    EXPECT_GT(limit, 50 * 100) << seconds;
  }
}

TEST_F(PollingWait, LeavesTheWaitingToTheTaskManager) {
  Record("alice", "1", kFirst);
  ASSERT_EQ(Wait("alice/1", "", 1), 0);
  int waits = 0;
  for (const std::string& call : tasks->calls) {
    waits += call.rfind("waitForChange(", 0) == 0 ? 1 : 0;
  }
  EXPECT_GE(waits, 1);
  EXPECT_LE(waits, 3);
}

}  // namespace
}  // namespace QELO
