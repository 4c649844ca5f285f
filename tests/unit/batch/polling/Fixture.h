#pragma once

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <functional>
#include <memory>
#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/support/FakeTask.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIPolling.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/batch/polling/APIPollingPrivate.h"

namespace QELO {

/// Calls of alice, an ordinary user, or of admin, an administrator, against a fresh task manager.
/// Background processes are real; they are collected, and ended when need be, after the test.
class PollingTest : public testing::Test {
 protected:
  void SetUp() override {
    platform = &FakePlatform::Reset();
    tasks = &FakeTask::Reset();
    SyslogCapture::Clear();
    Login("alice", false);
  }

  void TearDown() override {
    for (const pid_t child : children_) {
      kill(child, SIGKILL);
    }
    while (waitpid(-1, nullptr, 0) > 0) {
    }
    for (const SyslogCapture::Message& message : SyslogCapture::Messages()) {
      EXPECT_EQ(message.text.rfind("APIPolling.cpp:", 0), 0U) << message.text;
      EXPECT_EQ(message.priority, LOG_ERR) << message.text;
    }
  }

  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// The request is this user's call of QELO.Test.Task, version 2, method "start".
  void Login(const std::string& user, bool isAdmin) {
    Json::Value init;
    init["session"]["username"] = user;
    init["session"]["isAdmin"] = isAdmin;
    init["environ"]["REQUEST_METHOD"] = "POST";
    init["getParam"] = Parse(
        R"({"api":"QELO.Test.Task","version":2,"method":"start","path":"/a","_sid":"secret"})");
    request = std::make_unique<APIRequest>(init);
    response = std::make_unique<APIResponse>(request.get());
    polling = std::make_unique<APIPolling>(request.get());
  }

  /// A record with this body, whose work is done by `pid`, 0: by nobody yet.
  void Record(const std::string& owner, const std::string& taskId, const std::string& body,
              int pid = 0) const {
    Json::Value record;
    record["properties"]["auto_remove"] = false;
    record["properties"]["info"]["api"] = "QELO.Test.Task";
    record["properties"]["body"] = Parse(body);
    record["pid"] = pid;
    tasks->Put(owner, taskId, record);
  }

  Json::Value Property(const std::string& owner, const std::string& taskId,
                       const std::string& name) const {
    return JsonHelper::member(JsonHelper::member(tasks->Record(owner, taskId), "properties"), name);
  }

  /// A process that does `work` and ends.
  pid_t Fork(const std::function<void()>& work) {
    const pid_t child = fork();
    if (child == 0) {
      work();
      _exit(0);
    }
    children_.push_back(child);
    return child;
  }

  /// A process that waits to be ended.
  pid_t Sleeper() {
    return Fork([] {
      signal(SIGTERM, SIG_DFL);
      sleep(30);
    });
  }

  /// Runs a change of the records when an operation of the task manager has been called so often.
  void Meanwhile(const std::string& operation, const std::function<void()>& change,
                 int calls = 1) const {
    tasks->meanwhile = [=, left = calls](const std::string& name) mutable {
      if (name == operation && --left == 0) {
        change();
      }
    };
  }

  void RemoveMeanwhile(const std::string& operation, const std::string& taskId) const {
    Meanwhile(operation, [=, this] { tasks->Put("alice", taskId, Json::Value()); });
  }

  /// The signal that ended a child, 0 when it ended by itself.
  static int EndOf(pid_t child) {
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
  }

  /// Collects the one child that there is; fails when it was ended by a signal.
  static void JoinChild() {
    int status = 0;
    ASSERT_GT(waitpid(-1, &status, 0), 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << status;
  }

  static std::string Text(const Json::Value& value) { return JsonHelper::toString(value); }

  FakePlatform* platform = nullptr;
  FakeTask* tasks = nullptr;
  std::unique_ptr<APIRequest> request;
  std::unique_ptr<APIResponse> response;
  std::unique_ptr<APIPolling> polling;

 private:
  std::vector<pid_t> children_;
};

/// Milliseconds since it was made.
class Stopwatch {
 public:
  long Milliseconds() const {
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() -
                                                                 start_)
        .count();
  }

 private:
  std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

}  // namespace QELO
