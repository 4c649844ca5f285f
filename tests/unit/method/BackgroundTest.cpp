// Work that goes on in the background.

#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

#include "tests/support/FakeTask.h"
#include "tests/unit/method/Fixture.h"

namespace QELO {
namespace {

class MethodBackground : public MethodTest {
 protected:
  void SetUp() override {
    MethodTest::SetUp();
    FakeTask::Reset();
  }
  void TearDown() override {
    while (waitpid(-1, nullptr, 0) > 0) {
    }
  }

  /// The body that a task has when its process has ended.
  std::string Last(const std::string& taskId) {
    while (waitpid(-1, nullptr, 0) > 0) {
    }
    const Json::Value record = FakeTask::Get().Record("alice", taskId);
    EXPECT_TRUE(JsonHelper::asBool(JsonHelper::member(record, "finished")));
    return JsonHelper::toString(JsonHelper::member(record["properties"], "body"));
  }
};

template <typename Work>
Answered start(const Call& call, Work work) {
  return StartWork(call, {.prefix = "kit_", .limit = 1, .keepResult = true}, work);
}

Answered startCounting(const Call& call) {
  return start(call, [user = call.User()](Progress& progress) {
    progress.Tell(user + " at 1");
    progress.Tell(user + " at 2");  // too soon to be stored
    return user + " done";
  });
}

TEST_F(MethodBackground, ResultIsWhatTheWorkReturns) {
  EXPECT_EQ(Answer(Method<startCounting>),
            R"({"data":{"task_id":"alice/kit_id1"},"success":true})");
  EXPECT_EQ(Last("kit_id1"), R"({"data":"alice done","success":true})");
}

TEST_F(MethodBackground, WorkWithoutResultEndsWithWhatItToldLast) {
  Answer(Method<[](const Call& call) {
    return start(call, [](Progress& progress) {
      progress.Tell(1);
      progress.Tell(2);
    });
  }>);
  EXPECT_EQ(Last("kit_id1"), R"({"data":2,"success":true})");
}

TEST_F(MethodBackground, WorkThatTellsNothingSucceeds) {
  Answer(Method<[](const Call& call) { return start(call, [](Progress&) {}); }>);
  EXPECT_EQ(Last("kit_id1"), R"({"success":true})");
}

TEST_F(MethodBackground, ErrorOfTheWorkIsItsResult) {
  Answer(Method<[](const Call& call) {
    return start(call, [](Progress& progress) {
      progress.Tell("half");
      throw Error{420, "bad line"};
    });
  }>);
  EXPECT_EQ(Last("kit_id1"), R"({"error":{"code":420,"errors":"bad line"},"success":false})");
}

TEST_F(MethodBackground, ExceptionOfTheWorkIsNoSuccess) {
  Answer(Method<[](const Call& call) {
    return start(call, [](Progress& progress) -> int {
      progress.Tell("half");
      throw std::runtime_error("gone");
    });
  }>);
  EXPECT_EQ(Last("kit_id1"), R"({"error":{"code":117},"success":false})");
}

TEST_F(MethodBackground, LimitThatIsReachedIsAnError) {
  Json::Value record;
  record["properties"]["auto_remove"] = true;
  record["pid"] = getpid();
  FakeTask::Get().Put("alice", "kit_id0", record);
  EXPECT_EQ(Answer(Method<startCounting>), R"({"error":{"code":507},"success":false})");
}

TEST_F(MethodBackground, StartThatFailsIsAnError) {
  FakePlatform::Get().forkResult = -1;
  EXPECT_EQ(Answer(Method<startCounting>), R"({"error":{"code":110},"success":false})");
  FakeTask::Get().endUpdate = false;
  EXPECT_EQ(Answer(Method<startCounting>), R"({"error":{"code":500},"success":false})");
}

TEST_F(MethodBackground, GroupIsForThoseWhoMayHaveIt) {
  EXPECT_EQ(Answer(Method<[](const Call& call) {
              return StartWork(call, {.group = "admin"}, [](Progress&) {});
            }>),
            R"({"error":{"code":105},"success":false})");
}

TEST_F(MethodBackground, ProgressIsStoredAgainAfterAPause) {
  Answer(Method<[](const Call& call) {
    return start(call, [](Progress& progress) {
      progress.Tell(1);
      if (!progress.IsDue()) {
        usleep(Progress::kPauseMs * 1000);
      }
      progress.Tell(2);
      throw Error{progress.IsDue() ? 421 : 422};  // 2 was stored just now
    });
  }>);
  EXPECT_EQ(Last("kit_id1"), R"({"error":{"code":422},"success":false})");
}

}  // namespace
}  // namespace QELO
