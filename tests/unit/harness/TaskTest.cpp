// QELO.Work.Task: what of its parameters is taken. Its tasks are tested with real ones.

#include <gtest/gtest.h>
#include <webapi/testing/TestHost.h>

#include "tests/support/FakeTask.h"

namespace {

using QELO::TestHost;

class Task : public testing::Test {
 protected:
  Task() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Work.Task.lib.in"));
    host.AddUser("alice", 1001);
    host.LogIn("alice");
    Json::Value record;
    record["properties"]["body"]["success"] = true;
    record["properties"]["auto_remove"] = false;
    record["finished"] = true;
    FakeTask::Get().Put("alice", "a1", record);
    FakeTask::Get().Put("bob", "b1", record);
  }
  QELO::TestAnswer Call(const std::string& method, const TestHost::Params& params = {}) {
    return host.Call("QELO.Work.Task", 1, method, params);
  }

  TestHost host;
};

TEST_F(Task, ListHasTheCallersOwn) {
  EXPECT_EQ(Call("list").body, R"({"data":{"user":["alice/a1"]},"success":true})");
  EXPECT_EQ(Call("list", {{"groups", "admin"}}).Code(), 505);
  EXPECT_EQ(Call("list", {{"groups", "strangers"}}).Code(), 503);
  EXPECT_EQ(Call("list", {{"prefix", 5}}).Code(), 101);
}

TEST_F(Task, StatusIsOfOneOrOfSeveral) {
  EXPECT_EQ(Call("status", {{"task_id", "alice/a1"}}).Data()["finish"], true);
  EXPECT_EQ(Call("status", {{"task_id", "bob/b1"}}).Code(), 503);
  EXPECT_EQ(Call("status", {{"task_id", "alice/absent"}}).Code(), 508);
  EXPECT_EQ(Call("status").Code(), 101);
  Json::Value ids(Json::arrayValue);
  ids.append("alice/a1");
  ids.append("bob/b1");
  const Json::Value data = Call("status", {{"task_ids", ids}}).Data();
  EXPECT_EQ(data["alice/a1"]["finish"], true);
  EXPECT_EQ(data["bob/b1"], Json::Value(Json::objectValue));
  EXPECT_EQ(Call("status", {{"task_ids", ids}, {"task_id", "alice/a1"}}).Code(), 101);
}

TEST_F(Task, WaitIsBounded) {
  for (const Json::Value& seconds : {Json::Value(61), Json::Value(-1), Json::Value("1")}) {
    EXPECT_EQ(Call("wait", {{"task_id", "alice/a1"}, {"timeout", seconds}}).Code(), 101);
  }
  EXPECT_EQ(Call("wait", {{"task_id", "alice/a1"}, {"timeout", 0}}).Data()["finish"], true);
}

TEST_F(Task, StopMayRemove) {
  EXPECT_TRUE(Call("stop", {{"task_id", "alice/a1"}, {"remove", true}}).IsSuccess());
  EXPECT_EQ(Call("status", {{"task_id", "alice/a1"}}).Code(), 508);
  EXPECT_EQ(Call("stop", {{"task_id", "bob/b1"}}).Code(), 503);
}

}  // namespace
