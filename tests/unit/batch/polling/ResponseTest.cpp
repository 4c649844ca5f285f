// The response of a background task: what it is given is the task's result.

#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

class PollingResponse : public PollingTest {
 protected:
  void SetUp() override {
    PollingTest::SetUp();
    Become("alice", "1");
    tasks->Put("alice", "1", Parse("{}"));
    tasks->calls.clear();
  }

  /// The request is that of a task.
  void Become(const std::string& owner, const std::string& taskId) {
    Json::Value& environment = request->Serialize()["environ"];
    environment["task_user"] = owner;
    environment["task_id"] = taskId;
  }

  int Count(const std::string& call) const {
    int count = 0;
    for (const std::string& entry : tasks->calls) {
      count += entry.rfind(call, 0) == 0 ? 1 : 0;
    }
    return count;
  }
};

TEST_F(PollingResponse, OfAnOrdinaryRequestTouchesNoTask) {
  Login("alice", false);
  response->SetSuccess("x");
  response->SetError(400);
  EXPECT_TRUE(tasks->calls.empty());
}

TEST_F(PollingResponse, WithoutRequestTouchesNoTask) {
  APIResponse other(nullptr);
  other.SetSuccess("x");
  EXPECT_TRUE(tasks->calls.empty());
}

TEST_F(PollingResponse, StoresSuccessAsBody) {
  response->SetSuccess("x");
  EXPECT_EQ(Text(Property("alice", "1", "body")), R"({"data":"x","success":true})");
  EXPECT_EQ(Property("alice", "1", "task_run"), true);
}

TEST_F(PollingResponse, StoresErrorsAsBody) {
  response->SetError(400, "x");
  EXPECT_EQ(Text(Property("alice", "1", "body")),
            R"({"error":{"code":400,"errors":"x"},"success":false})");
  EXPECT_EQ(Property("alice", "1", "task_run"), true);
}

TEST_F(PollingResponse, StoresBodyAndMarkInOneUpdate) {
  response->SetSuccess();
  EXPECT_EQ(tasks->calls.back(), R"(endUpdate({"body":{"success":true},"task_run":true}))");
  EXPECT_EQ(Count("endUpdate"), 1);
}

TEST_F(PollingResponse, MakesTheHandleOnce) {
  response->SetSuccess();
  response->SetSuccess("x");
  EXPECT_EQ(Count("Task(alice, 1)"), 1);
  EXPECT_EQ(Count("endUpdate"), 2);
}

TEST_F(PollingResponse, OfATaskWithinATaskHasAHandleOfItsOwn) {
  response->SetSuccess("outer");
  tasks->Put("@users", "1", Parse("{}"));
  EndOf(Fork([this] {
    Become("@users", "1");
    response->SetSuccess("inner");
  }));
  EXPECT_EQ(Property("alice", "1", "body")["data"], "outer");
  EXPECT_EQ(Property("@users", "1", "body")["data"], "inner");
}

TEST_F(PollingResponse, IsSetAlsoWhenTheTaskCannotBeStored) {
  tasks->endUpdate = false;
  response->SetError(400);
  EXPECT_EQ(response->GetError(), 400);
  EXPECT_TRUE(Property("alice", "1", "body").isNull());
}

TEST_F(PollingResponse, AddsNothingToTheRecordWhateverItHolds) {
  for (const bool stored : {true, false}) {
    tasks->endUpdate = stored;
    for (const char* option : {"{}", "null", "\"text\"", "[1]", "7"}) {
      Json::Value record = Parse(R"({"code":0,"headers":{}})");
      record["option"] = Parse(option);
      response->Deserialize(record);
      response->SetSuccess("x");
      EXPECT_EQ(response->Serialize()["option"], Parse(option)) << stored;
    }
    Json::Value bare = Parse(R"({"code":0,"headers":{}})");
    response->Deserialize(bare);
    response->SetSuccess("x");
    EXPECT_EQ(response->Serialize().getMemberNames(),
              (std::vector<std::string>{"body", "code", "headers"}));
  }
}

}  // namespace
}  // namespace QELO
