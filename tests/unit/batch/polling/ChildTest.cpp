// The background process: what it is given, what becomes of its results and its end.

#include <fcntl.h>
#include <poll.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "tests/unit/batch/polling/Fixture.h"
#include "webapi/runner/execution/StandardStreams.h"

namespace QELO {
namespace {

/// Marks that handlers for the end of the test program ran in another process of it.
std::string markOfExit;
const pid_t testProgram = getpid();
void markExit() {
  if (getpid() != testProgram && !markOfExit.empty()) {
    std::ofstream(markOfExit) << "exit";
  }
}

void succeed(APIRequest*, APIResponse* answer, void*) {
  answer->SetSuccess();
}

class PollingChild : public PollingTest {
 protected:
  void SetUp() override {
    PollingTest::SetUp();
    polling->SetRemoveAttr(false);
  }

  /// Runs work to its end. @return its record
  Json::Value Run(APIPolling::Work work, void* arg = nullptr) {
    EXPECT_TRUE(polling->Start(response.get(), work, arg));
    JoinChild();
    return tasks->Record("alice", "id1");
  }

  Json::Value BodyAfter(APIPolling::Work work, void* arg = nullptr) {
    return Run(work, arg)["properties"]["body"];
  }

  /// What the background process logs.
  std::string LogOf(APIPolling::Work work) {
    SyslogCapture::Clear();
    const std::string path = File("log");
    SyslogCapture::Copy() = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    Run(work);
    close(SyslogCapture::Copy());
    SyslogCapture::Copy() = -1;
    const std::string log = Content(path);
    std::istringstream lines(log);
    for (std::string line; std::getline(lines, line);) {
      EXPECT_EQ(line.rfind("<3>APIPolling.cpp:", 0), 0U) << line;
    }
    return log;
  }

  std::string File(const char* name) const {
    return (std::filesystem::path(tasks->directory).parent_path() / name).string();
  }

  static std::string Content(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path).rdbuf();
    return text.str();
  }
};

TEST_F(PollingChild, HasNothingButTheTaskInItsEnvironment) {
  const Json::Value body = BodyAfter(
      [](APIRequest* call, APIResponse* answer, void*) { answer->SetSuccess(call->GetEnv("")); });
  EXPECT_EQ(Text(body["data"]),
            R"({"full_task_id":"alice/id1","task_id":"id1","task_user":"alice"})");
}

TEST_F(PollingChild, IsAPollingTaskWithTheCallersSessionAndParameters) {
  const Json::Value body = BodyAfter([](APIRequest* call, APIResponse* answer, void*) {
    Json::Value data;
    data["is"] = call->IsPollingTask();
    data["id"] = call->GetPollingTaskId();
    data["user"] = call->GetLoginUserName();
    data["path"] = call->GetParam("path");
    answer->SetSuccess(data);
  });
  EXPECT_EQ(Text(body["data"]), R"({"id":"alice/id1","is":true,"path":"/a","user":"alice"})");
}

TEST_F(PollingChild, GetsTheArgument) {
  int number = 7;
  const Json::Value body = BodyAfter([](APIRequest*, APIResponse* answer,
                                        void* arg) { answer->SetSuccess(*static_cast<int*>(arg)); },
                                     &number);
  EXPECT_EQ(body["data"], 7);
}

TEST_F(PollingChild, LeadsASessionAndIsTheRecordedProcess) {
  const Json::Value record = Run([](APIRequest*, APIResponse* answer, void*) {
    Json::Value data;
    data["pid"] = getpid();
    data["leads"] = getsid(0) == getpid();
    answer->SetSuccess(data);
  });
  EXPECT_EQ(record["properties"]["body"]["data"]["leads"], true);
  EXPECT_EQ(record["properties"]["body"]["data"]["pid"], record["pid"]);
}

TEST_F(PollingChild, EndsBySigtermWhateverTheStarterDoesWithIt) {
  signal(SIGTERM, SIG_IGN);
  const bool started = polling->Start(
      response.get(),
      [](APIRequest*, APIResponse* own, void*) {
        own->SetSuccess();
        sleep(30);
      },
      nullptr);
  signal(SIGTERM, SIG_DFL);
  ASSERT_TRUE(started);
  const pid_t pid = JsonHelper::asInt(tasks->Record("alice", "id1")["pid"]);
  kill(pid, SIGTERM);
  EXPECT_EQ(EndOf(pid), SIGTERM);
}

TEST_F(PollingChild, EndsBySigtermThatTheStarterBlocks) {
  sigset_t stop;
  sigemptyset(&stop);
  sigaddset(&stop, SIGTERM);
  ASSERT_EQ(sigprocmask(SIG_BLOCK, &stop, nullptr), 0);
  const bool started = polling->Start(
      response.get(),
      [](APIRequest*, APIResponse* own, void*) {
        own->SetSuccess();
        sleep(30);
      },
      nullptr);
  ASSERT_EQ(sigprocmask(SIG_UNBLOCK, &stop, nullptr), 0);
  ASSERT_TRUE(started);
  const pid_t pid = JsonHelper::asInt(tasks->Record("alice", "id1")["pid"]);
  kill(pid, SIGTERM);
  const Stopwatch watch;
  EXPECT_EQ(EndOf(pid), SIGTERM);
  EXPECT_LT(watch.Milliseconds(), 5000);
}

TEST_F(PollingChild, ThatIsStoppedBeforeItIsRecordedDoesNotWork) {
  Meanwhile("setCreatePid", [] {
    FakeTask::Get().Change("alice", "id1", false,
                           [](Json::Value& record) { record["finished"] = true; });
  });
  EXPECT_EQ(LogOf(succeed), "");
  EXPECT_TRUE(Property("alice", "id1", "body").isNull());
  EXPECT_EQ(tasks->Record("alice", "id1")["finished"], true);
}

TEST_F(PollingChild, ThatIsStoppedAndRemovedBeforeItIsRecordedDoesNotWork) {
  RemoveMeanwhile("setCreatePid", "id1");
  std::string path = File("worked");
  EXPECT_TRUE(Run([](APIRequest*, APIResponse*,
                     void* arg) { std::ofstream(*static_cast<std::string*>(arg)) << "worked"; },
                  &path)
                  .isNull());
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(PollingChild, ThatIsRemovedBeforeItIsRecordedLogsNothing) {
  RemoveMeanwhile("setCreatePid", "id1");
  EXPECT_EQ(LogOf(succeed), "");
}

TEST_F(PollingChild, ThatIsRemovedWhileItWorksEndsQuietly) {
  EXPECT_EQ(LogOf([](APIRequest*, APIResponse* answer, void*) {
              answer->SetSuccess("progress");
              FakeTask::Get().Put("alice", "id1", Json::Value());
              answer->SetSuccess("result");
            }),
            "");
  EXPECT_TRUE(tasks->Record("alice", "id1").isNull());
}

TEST_F(PollingChild, ThatIsRemovedWithoutAResultEndsQuietly) {
  EXPECT_EQ(LogOf([](APIRequest*, APIResponse*, void*) {
              FakeTask::Get().Put("alice", "id1", Json::Value());
            }),
            "");
  EXPECT_TRUE(tasks->Record("alice", "id1").isNull());
}

constexpr size_t kSmall = 1000;
void progressAndTooLargeResult(APIRequest*, APIResponse* answer, void*) {
  FakeTask::Get().largestUpdate = kSmall;
  answer->SetSuccess("progress");
  answer->SetSuccess(std::string(kSmall, 'x'));
}

TEST_F(PollingChild, WhoseResultCannotBeStoredKeepsTheOneBefore) {
  const Json::Value record = Run(progressAndTooLargeResult);
  EXPECT_EQ(Text(record["properties"]["body"]), R"({"data":"progress","success":true})");
  EXPECT_EQ(record["finished"], true);
}

TEST_F(PollingChild, WhoseResultCannotBeStoredIsLogged) {
  EXPECT_NE(LogOf(progressAndTooLargeResult).find(" cannot store a result of task id[alice/id1]\n"),
            std::string::npos);
}

TEST_F(PollingChild, WhoseProgressCannotBeStoredKeepsTheLaterResult) {
  const Json::Value body = BodyAfter([](APIRequest*, APIResponse* answer, void*) {
    FakeTask::Get().largestUpdate = kSmall;
    answer->SetSuccess(std::string(kSmall, 'x'));
    answer->SetSuccess("result");
  });
  EXPECT_EQ(Text(body), R"({"data":"result","success":true})");
}

TEST_F(PollingChild, WhoseResultsCanAllNotBeStoredEndsTheTask) {
  const Json::Value record = Run([](APIRequest*, APIResponse* answer, void*) {
    answer->SetSuccess("progress");
    FakeTask::Get().endUpdate = false;
    answer->SetSuccess("result");
  });
  EXPECT_EQ(record["properties"]["body"]["data"], "progress");
  EXPECT_EQ(record["finished"], true);
}

TEST_F(PollingChild, WithoutThePropertyAutoRemoveKeepsTheRecord) {
  polling->SetRemoveAttr(true);
  const Json::Value record = Run([](APIRequest*, APIResponse* answer, void*) {
    answer->SetSuccess();
    FakeTask::Get().Change("alice", "id1", false, [](Json::Value& stored) {
      stored["properties"].removeMember("auto_remove");
    });
  });
  EXPECT_EQ(record["finished"], true);
}

TEST_F(PollingChild, RunsNoCallbacksThatTheWorkRegisters) {
  static std::string mark;
  mark = File("called");
  Run([](APIRequest*, APIResponse* answer, void*) {
    const auto callback = [](void*) { std::ofstream(mark) << "called"; };
    answer->SetCallbackFunc(callback, nullptr);
    answer->SetCallbackFunc(callback, nullptr);
    answer->SetSuccess(static_cast<int>(answer->GetCallbackFuncs()->size()));
  });
  EXPECT_EQ(Property("alice", "id1", "body")["data"], 1) << "the second is the first once more";
  EXPECT_FALSE(std::filesystem::exists(mark));
  EXPECT_TRUE(response->GetCallbackFuncs()->empty()) << "the starter's own list is another";
}

TEST_F(PollingChild, EachResultReplacesTheOneBefore) {
  const Json::Value record = Run([](APIRequest*, APIResponse* answer, void*) {
    answer->SetSuccess("first");
    answer->SetError(400, "second");
  });
  EXPECT_EQ(Text(record["properties"]["body"]),
            R"({"error":{"code":400,"errors":"second"},"success":false})");
  EXPECT_EQ(record["properties"]["task_run"], true);
}

TEST_F(PollingChild, EndsTheTaskWhenTheWorkReturns) {
  const Json::Value record = Run(succeed);
  EXPECT_EQ(record["finished"], true);
}

TEST_F(PollingChild, WithAutoRemoveRemovesTheRecordAtTheEnd) {
  polling->SetRemoveAttr(true);
  EXPECT_TRUE(Run(succeed).isNull());
}

TEST_F(PollingChild, RemovesByTheRecordsOwnWord) {
  const Json::Value record = Run([](APIRequest*, APIResponse* answer, void*) {
    answer->SetSuccess();
    FakeTask::Get().Change("alice", "id1", false,
                           [](Json::Value& stored) { stored["properties"]["auto_remove"] = true; });
  });
  EXPECT_TRUE(record.isNull());
}

TEST_F(PollingChild, ThatThrowsKeepsTheResultThatItStored) {
  const Json::Value body = BodyAfter([](APIRequest*, APIResponse* answer, void*) {
    answer->SetSuccess("half");
    throw std::runtime_error("disk on fire");
  });
  EXPECT_EQ(Text(body), R"({"data":"half","success":true})");
}

TEST_F(PollingChild, ThatThrowsWithoutAResultAnswers117) {
  const Json::Value record = Run([](APIRequest*, APIResponse*, void*) { throw 7; });
  EXPECT_EQ(Text(record["properties"]["body"]), R"({"error":{"code":117},"success":false})");
  EXPECT_EQ(record["finished"], true);
}

TEST_F(PollingChild, ThatSetsNoResultAnswers117) {
  EXPECT_EQ(Text(BodyAfter([](APIRequest*, APIResponse*, void*) {})),
            R"({"error":{"code":117},"success":false})");
}

TEST_F(PollingChild, RunsNoHandlersOfTheStartersEnd) {
  static const bool registered = std::atexit(markExit) == 0;
  ASSERT_TRUE(registered);
  markOfExit = File("exit");
  Run(succeed);
  EXPECT_FALSE(std::filesystem::exists(markOfExit));
  markOfExit.clear();
}

TEST_F(PollingChild, FlushesWhatTheWorkWroteToCFiles) {
  std::string path = File("written");
  Run(
      [](APIRequest*, APIResponse* answer, void* arg) {
        std::FILE* file = std::fopen(static_cast<std::string*>(arg)->c_str(), "we");
        std::fputs("all of it", file);
        answer->SetSuccess();
      },
      &path);
  EXPECT_EQ(Content(path), "all of it");
}

TEST_F(PollingChild, ThatThrowsIsLogged) {
  EXPECT_NE(LogOf([](APIRequest*, APIResponse*, void*) {
              throw std::runtime_error("disk on fire");
            }).find("polling task threw an exception: disk on fire\n"),
            std::string::npos);
}

TEST_F(PollingChild, WhoseEndCannotBeStoredIsLogged) {
  tasks->finish = false;
  EXPECT_NE(LogOf(succeed).find(" set task id[alice/id1] to finish fail\n"), std::string::npos);
}

TEST_F(PollingChild, WhoseProcessCannotBeRecordedIsLogged) {
  tasks->setCreatePid = false;
  EXPECT_NE(LogOf(succeed).find(" Failed to set property.\n"), std::string::npos);
}

TEST_F(PollingChild, ThatSucceedsLogsNothing) {
  EXPECT_EQ(LogOf(succeed), "");
}

/// A reader of a pipe's other end sees its end within this time.
bool endsWithin(int reader, int milliseconds) {
  pollfd entry{reader, POLLIN, 0};
  char byte = 0;
  return ::poll(&entry, 1, milliseconds) == 1 && read(reader, &byte, 1) == 0;
}

TEST_F(PollingChild, DoesNotHoldTheOutputThatTheCallIsShutOffFrom) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const int former = fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, 10);
  fflush(stdout);
  dup2(ends[1], STDOUT_FILENO);
  close(ends[1]);
  bool started = false;
  {
    const StandardStreams outer(false, true);  // a call within a call
    const StandardStreams inner(false, true);
    started = polling->Start(
        response.get(),
        [](APIRequest*, APIResponse* own, void*) {
          own->SetSuccess();
          sleep(30);
        },
        nullptr);
  }
  dup2(former, STDOUT_FILENO);
  close(former);
  EXPECT_TRUE(started);
  EXPECT_TRUE(endsWithin(ends[0], 2000));
  close(ends[0]);
  kill(JsonHelper::asInt(tasks->Record("alice", "id1")["pid"]), SIGKILL);
}

TEST_F(PollingChild, ThatStartsATaskOfItsOwnKeepsTheResultsApart) {
  Run([](APIRequest* call, APIResponse* answer, void*) {
    answer->SetSuccess("before");
    FakeTask::Get().nextId = "id2";
    APIPolling inner(call);
    inner.SetRemoveAttr(false);
    inner.Start(
        answer, [](APIRequest*, APIResponse* own, void*) { own->SetSuccess("inner"); }, nullptr);
    waitpid(-1, nullptr, 0);
  });
  EXPECT_EQ(Property("alice", "id2", "body")["data"], "inner");
  EXPECT_EQ(Text(Property("alice", "id1", "body")["data"]), R"({"task_id":"alice/id2"})");
}

}  // namespace
}  // namespace QELO
