// Starting a task as its caller sees it: checks, the record, the answer.

#include "tests/unit/batch/polling/Fixture.h"
#include "webapi/platform/Task.h"

namespace QELO {
namespace {

void succeed(APIRequest*, APIResponse* response, void*) {
  response->SetSuccess("first");
}

void succeedAndGoOn(APIRequest*, APIResponse* response, void*) {
  response->SetSuccess("first");
  sleep(30);
}

void goOn(APIRequest*, APIResponse*, void*) {
  sleep(30);
}

class PollingStart : public PollingTest {
 protected:
  /// Ends the background process of a task.
  void End(const std::string& owner, const std::string& taskId) const {
    const int pid = JsonHelper::asInt(JsonHelper::member(tasks->Record(owner, taskId), "pid"));
    ASSERT_GT(pid, 0);
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
  }

  std::string Body() const { return Text(response->GetBody()); }
};

TEST_F(PollingStart, WithoutRequestFails) {
  polling->SetRequest(nullptr);
  EXPECT_FALSE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(polling->GetError(), 502);
  EXPECT_EQ(SyslogCapture::Count("unknown request"), 1);
  EXPECT_EQ(Body(), "{}");
}

TEST_F(PollingStart, WithoutResponseFails) {
  EXPECT_FALSE(polling->Start(nullptr, succeed, nullptr));
  EXPECT_EQ(polling->GetError(), 502);
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 1);
}

TEST_F(PollingStart, WithoutWorkFails) {
  EXPECT_FALSE(polling->Start(response.get(), nullptr, nullptr));
  EXPECT_EQ(polling->GetError(), 502);
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 1);
  EXPECT_TRUE(platform->calls.empty());
}

TEST_F(PollingStart, RequestSetLaterCounts) {
  APIPolling later;
  later.SetRequest(request.get());
  EXPECT_TRUE(later.Start(response.get(), succeed, nullptr));
}

TEST_F(PollingStart, OfNoGroupBelongsToTheLoginUser) {
  polling->SetPrefixAttr("copy_");
  ASSERT_TRUE(polling->Start(response.get(), succeedAndGoOn, nullptr));
  EXPECT_EQ(Body(), R"({"data":{"task_id":"alice/copy_id1"},"success":true})");
  EXPECT_EQ(tasks->calls[0], "getUniqueID(alice, copy_)");
  End("alice", "copy_id1");
}

TEST_F(PollingStart, OfGroupAdminBelongsToTheAdministrators) {
  Login("admin", true);
  polling->SetGroupAttr("admin");
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(Body(), R"({"data":{"task_id":"@administrators/id1"},"success":true})");
}

TEST_F(PollingStart, OfGroupEveryoneBelongsToAllUsers) {
  polling->SetGroupAttr("everyone");
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(Body(), R"({"data":{"task_id":"@users/id1"},"success":true})");
}

TEST_F(PollingStart, OfGroupAdminByAnotherUserIs105) {
  Login("admin", true);
  APIPolling granted(request.get());
  granted.SetGroupAttr("admin");
  Login("alice", false);
  granted.SetRequest(request.get());
  EXPECT_FALSE(granted.Start(response.get(), succeed, nullptr));
  EXPECT_EQ(response->GetError(), 105);
  EXPECT_EQ(granted.GetError(), 500) << "the response has the reason";
  EXPECT_TRUE(tasks->Ids("@administrators").empty());
}

TEST_F(PollingStart, OfUnknownGroupIs114) {
  APIPollingPrivate own(request.get(), nullptr);
  own.SetData("polling_attribute", "share_to_group", "nobody", true);
  EXPECT_FALSE(own.Start(response.get(), succeed, nullptr));
  EXPECT_EQ(response->GetError(), 114);
  EXPECT_EQ(own.error(), 500);
  EXPECT_TRUE(platform->calls.empty());
}

TEST_F(PollingStart, RecordsTheCall) {
  polling->SetPrefixAttr("copy_");
  polling->SetGroupAttr("everyone");
  polling->SetRemoveAttr(false);
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(Text(Property("@users", "copy_id1", "info")),
            R"({"api":"QELO.Test.Task","group":"everyone","method":"start",)"
            R"("param":{"path":"/a"},"prefix":"copy_","version":2})");
  EXPECT_EQ(Property("@users", "copy_id1", "auto_remove"), false);
}

TEST_F(PollingStart, RecordsTheCallInOneUpdate) {
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  ASSERT_EQ(tasks->calls[1], "Task(alice, id1)");
  EXPECT_EQ(tasks->calls[2].rfind("endUpdate({\"auto_remove\":true,\"info\":{", 0), 0U)
      << tasks->calls[2];
}

TEST_F(PollingStart, RecordsNoCredentialParameters) {
  Json::Value params;
  params["postParam"] =
      Parse(R"({"_sid":"s","tid":"t","_sharing_id":"i","_sharing_sid":"h","sid":"mine"})");
  request->InitParam(params, true);
  polling->SetRemoveAttr(false);
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(Text(Property("alice", "id1", "info")["param"]), R"({"sid":"mine"})");
  EXPECT_EQ(request->GetParam("_sid"), "s");
}

TEST_F(PollingStart, WithAutoRemoveParamsRecordsNoParameters) {
  polling->SetRemoveParam(true);
  polling->SetRemoveAttr(false);
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  const Json::Value info = Property("alice", "id1", "info");
  EXPECT_FALSE(info.isMember("param"));
  EXPECT_EQ(info["method"], "start");
}

TEST_F(PollingStart, ThatCannotRecordFails) {
  tasks->endUpdate = false;
  response->SetError(117);
  EXPECT_FALSE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(SyslogCapture::Count("Failed to set property."), 1);
  EXPECT_EQ(response->GetError(), 117);
  EXPECT_EQ(polling->GetError(), 500);
  EXPECT_TRUE(platform->calls.empty()) << "nothing may have been forked";
}

TEST_F(PollingStart, ThatCannotForkRemovesTheRecord) {
  platform->forksLeft = 0;
  EXPECT_FALSE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(response->GetError(), 110);
  EXPECT_EQ(polling->GetError(), 500);
  EXPECT_EQ(SyslogCapture::Count(" Failed to fork(). Resource temporarily unavailable"), 1);
  EXPECT_TRUE(tasks->Ids("alice").empty());
}

TEST_F(PollingStart, AnswersAtOnceWithTheFirstResult) {
  const Stopwatch watch;
  ASSERT_TRUE(polling->Start(response.get(), succeedAndGoOn, nullptr));
  EXPECT_LT(watch.Milliseconds(), 400);
  EXPECT_EQ(Property("alice", "id1", "task_run"), true);
  End("alice", "id1");
}

TEST_F(PollingStart, WithoutResultAnswersAfterTheLimit) {
  const Stopwatch watch;
  ASSERT_TRUE(polling->Start(response.get(), goOn, nullptr));
  EXPECT_GE(watch.Milliseconds(), 550);
  EXPECT_EQ(tasks->calls.back(), "waitForDataReady(task_run, 60)");
  EXPECT_EQ(Body(), R"({"data":{"task_id":"alice/id1"},"success":true})");
  End("alice", "id1");
}

TEST_F(PollingStart, LeavesTheCallersRequestAsItWas) {
  ASSERT_TRUE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(request->GetEnv("REQUEST_METHOD"), "POST");
  EXPECT_FALSE(request->IsPollingTask());
}

TEST_F(PollingStart, WithinTheLimitStarts) {
  Record("alice", "a1", "{}", Sleeper());
  Record("alice", "a2", "{}", Fork([] {}));  // ended
  Record("alice", "b3", "{}", Sleeper());    // another prefix
  Record("alice", "id9", "{}", Sleeper());   // younger
  tasks->nextId = "3";
  polling->SetPrefixAttr("a");
  polling->SetLimit(2);
  while (ARDO::Task("alice", "a2").getCreatePid() != 0) {
    usleep(1000);
  }
  EXPECT_TRUE(polling->Start(response.get(), succeed, nullptr));
}

TEST_F(PollingStart, BeyondTheLimitIs507AndLeavesNoRecord) {
  Record("alice", "a1", "{}", Sleeper());
  Record("alice", "a2", "{}", Sleeper());
  tasks->nextId = "3";
  polling->SetPrefixAttr("a");
  polling->SetLimit(2);
  EXPECT_FALSE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(polling->GetError(), 507);
  EXPECT_EQ(Body(), "{}");
  EXPECT_TRUE(tasks->Record("alice", "a3").isNull());
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), 0) << "the sleepers alone";
}

TEST_F(PollingStart, WithALimitThatCannotBeTalliedIs504) {
  polling->SetLimit(2);
  Meanwhile("endUpdate", [] { FakeTask::Get().busy = true; });
  EXPECT_FALSE(polling->Start(response.get(), succeed, nullptr));
  EXPECT_EQ(polling->GetError(), 504);
}

}  // namespace
}  // namespace QELO
