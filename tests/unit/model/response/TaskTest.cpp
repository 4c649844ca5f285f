#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/support/FakeTask.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIResponse.h"

using namespace QELO;

namespace {

class ResponseTask : public testing::Test {
 protected:
  ResponseTask() { FakeTask::Reset(); }

  static Json::Value property(const std::string& id, const std::string& name) {
    return JsonHelper::member(FakeTask::Get().Record("alice", id)["properties"], name);
  }
  static long handles() {
    const auto& calls = FakeTask::Get().calls;
    return std::count_if(calls.begin(), calls.end(),
                         [](const std::string& call) { return call.starts_with("Task("); });
  }

  APIRequest request_ = requestWithEnv(R"({"task_user":"alice","task_id":"1"})");
  APIResponse response_{&request_};
};

}  // namespace

TEST_F(ResponseTask, HasEachResultAtOnceThroughOneHandle) {
  response_.SetSuccess("first");
  EXPECT_EQ(property("1", "body"), json(R"({"data":"first","success":true})"));
  EXPECT_EQ(property("1", "task_run"), Json::Value(true));
  response_.SetError(105);
  EXPECT_EQ(property("1", "body"), json(R"({"error":{"code":105},"success":false})"));
  EXPECT_EQ(handles(), 1);
}

TEST_F(ResponseTask, HasBodyAndMarkOfEachResultFromOneUpdate) {
  const std::vector<std::string> update{"beginUpdate", "setProperty(body)", "setProperty(task_run)",
                                        "endUpdate"};
  response_.SetSuccess("data");
  EXPECT_EQ(FakeTask::Get().updateSteps, update);
  FakeTask::Get().updateSteps.clear();
  response_.SetError(105);
  EXPECT_EQ(FakeTask::Get().updateSteps, update);
}

TEST_F(ResponseTask, IsUntouchedByARequestThatIsNone) {
  APIRequest other;
  APIResponse response(&other);
  response.SetSuccess("data");
  APIResponse(nullptr).SetSuccess("data");
  EXPECT_TRUE(FakeTask::Get().calls.empty());
}

TEST_F(ResponseTask, IsStillUpdatedAfterTheRequestLostItsId) {
  response_.SetSuccess("first");
  request_.Serialize()["environ"].clear();
  response_.SetSuccess("second");
  EXPECT_EQ(property("1", "body"), json(R"({"data":"second","success":true})"));
}

TEST_F(ResponseTask, IsTheOneOfTheFirstResultWhateverTheRequestSaysLater) {
  response_.SetSuccess("first");
  request_.InitEnv(json(R"({"task_id":"2"})"));
  response_.SetSuccess("second");
  EXPECT_EQ(property("1", "body"), json(R"({"data":"second","success":true})"));
  EXPECT_TRUE(FakeTask::Get().Record("alice", "2").isNull());
}

TEST_F(ResponseTask, OfAForkedProcessIsItsOwn) {
  response_.SetSuccess("parent");
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    request_.InitEnv(json(R"({"task_id":"2"})"));
    response_.SetSuccess("child");
    _exit(0);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(property("2", "body"), json(R"({"data":"child","success":true})"));
  EXPECT_EQ(property("1", "body"), json(R"({"data":"parent","success":true})"));
  response_.SetSuccess("again");
  EXPECT_EQ(property("1", "body"), json(R"({"data":"again","success":true})"));
}
