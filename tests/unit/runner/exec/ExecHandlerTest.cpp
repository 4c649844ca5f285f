#include "webapi/ExecHandler.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <syslog.h>

#include <cstring>
#include <iterator>

#include "tests/unit/runner/exec/Fixture.h"

namespace QELO {
namespace {

class Exec : public ExecTest {};

// The answer

TEST_F(Exec, AnswerIsTheBodyWithTheRestartFlag) {
  for (const int version : {1, 2}) {
    EXPECT_EQ(APIRunner::Exec(Call("silent", version)),
              Parse(R"({"success": false, "error": {"code": 117}, "httpd_restart": false})"));
    EXPECT_EQ(APIRunner::Exec(Call("restart", version)),
              Parse(R"({"success": true, "httpd_restart": true})"));
    const Json::Value answer = APIRunner::Exec(Call("echo", version, R"({"a": [1, "x"]})"));
    EXPECT_EQ(answer["data"]["a"], Parse(R"([1, "x"])"));
    EXPECT_EQ(answer["data"]["method"], Json::Value("echo"));
  }
}

TEST_F(Exec, ErrorsOfTheCallAreItsOwnAnswer) {
  EXPECT_EQ(APIRunner::Exec(Call("echo", 1, "{}", "QELO.Test.Unknown"))["error"]["code"],
            Json::Value(102));
  EXPECT_EQ(APIRunner::Exec(Call("unknown"))["error"]["code"], Json::Value(103));
  EXPECT_EQ(APIRunner::Exec(Call("echo", 9))["error"]["code"], Json::Value(104));
  EXPECT_EQ(APIRunner::Exec(Call("echo", 0))["error"]["code"], Json::Value(101));
  EXPECT_EQ(APIRunner::Exec(Call("fail", 1, R"({"code": 444})"))["error"]["code"],
            Json::Value(444));
}

TEST_F(Exec, MissingAPIMethodOrUserIs101AndNothingIsRun) {
  for (const ExecParam& param : {Call("echo").SetAPI(""), Call("echo").SetMethod(""),
                                 Call("echo").SetRunner(""), ExecParam()}) {
    SyslogCapture::Clear();
    EXPECT_EQ(APIRunner::Exec(param), Failure(101));
    ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
    EXPECT_EQ(SyslogCapture::Count("ExecHandler.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("missing parameter."), 1);
  }
  EXPECT_TRUE(platform->calls.empty());
  EXPECT_EQ(Variable("USERNAME"), "before");
}

// Where it runs

TEST_F(Exec, GrantableMethodRunsInThisProcess) {
  EXPECT_EQ(APIRunner::Exec(Call("process", 2))["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(Forks(), 0);
}

TEST_F(Exec, MethodGrantedByDefaultRunsInThisProcess) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  Describe(kEntries, "entries", {"process"}, R"({"grantByDefault": true})");
  EXPECT_EQ(APIRunner::Exec(Call("process", 1))["data"]["pid"].asInt(), getpid());
}

TEST_F(Exec, OtherMethodRunsInAChild) {
  EXPECT_NE(APIRunner::Exec(Call("process", 1))["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(Forks(), 1);
}

TEST_F(Exec, WithAnOutputItIsAlwaysAChild) {
  const int output = memfd_create("output", MFD_CLOEXEC);
  const Json::Value answer = APIRunner::Exec(Call("process", 2).SetOutputFd(output));
  EXPECT_TRUE(answer["success"].asBool());
  EXPECT_NE(answer["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(Forks(), 1);
  close(output);
}

TEST_F(Exec, NestedCompoundRequestRuns) {
  WriteFile("QELO.Entry.Request",
            R"({"QELO.Entry.Request": {"lib": "", "minVersion": 1, "maxVersion": 1,
            "methods": {"1": ["request"]}}})");
  const Json::Value answer = APIRunner::Exec(Call("request", 1, R"({"compound": [
      {"api": "QELO.Test.Entries", "version": 1, "method": "process"},
      {"api": "QELO.Test.Entries", "version": 2, "method": "fail"}]})",
                                                  "QELO.Entry.Request"));
  EXPECT_EQ(answer["data"]["has_fail"], Json::Value(true));
  EXPECT_EQ(answer["data"]["result"][0]["data"]["user"], Json::Value("alice"));
  EXPECT_EQ(answer["data"]["result"][1]["error"]["code"], Json::Value(400));
}

// The forged request

TEST_F(Exec, RequestIsForgedAsALoggedInPost) {
  for (const int isAdmin : {1, 0, -1}) {
    platform->isAdmin = isAdmin;
    Describe("QELO.Test.Good", "good", {"whoami"});
    const Json::Value data = APIRunner::Exec(Call("whoami", 1, "{}", "QELO.Test.Good"))["data"];
    EXPECT_EQ(data["user"], Json::Value("alice"));
    EXPECT_EQ(data["isAdmin"], Json::Value(isAdmin == 1));
    EXPECT_EQ(data["isAuthorized"], Json::Value(true));
  }
  EXPECT_EQ(platform->calls.front(), "QLIBGroupIsAdminGroupMem(alice)");
}

TEST_F(Exec, EnvironmentOfTheCallCountsAndItIsAPost) {
  const ExecParam param = Call("process").SetEnv(
      Parse(R"({"QUERY_STRING": "x=1", "REQUEST_METHOD": "GET", "NUMBER": 5})"));
  const Json::Value data = APIRunner::Exec(param)["data"];
  EXPECT_EQ(data["requestMethod"], Json::Value("POST"));
  EXPECT_EQ(data["hasQuery"], Json::Value(true));
}

TEST_F(Exec, AttributesAndASessionThatIsNotTimedOutReachTheMethod) {
  for (const int version : {1, 2}) {
    const ExecParam param = Call("forged", version).SetAttr(Parse(R"({"mark": [1, "x"]})"));
    const Json::Value data = APIRunner::Exec(param)["data"];
    EXPECT_EQ(data["mark"], Parse(R"([1, "x"])"));
    EXPECT_EQ(data["isTimeout"], Json::Value(false));
  }
}

TEST_F(Exec, BrokenRecordDoesNoHarm) {
  ExecParam param = Call("echo");
  param.Serialize()["env"] = "text";
  param.Serialize()["attr"] = Json::Value(Json::arrayValue);
  EXPECT_TRUE(APIRunner::Exec(param)["success"].asBool());
  Json::Value record = 5;
  param.Deserialize(record);
  EXPECT_EQ(APIRunner::Exec(param), Failure(101));
}

TEST_F(Exec, OverloadsBuildTheCall) {
  Json::Value result;
  const Json::Value params = Parse(R"({"a": 1, "api": "other", "method": "other", "version": 7})");
  const Json::Value expected = Parse(R"({"success": true, "httpd_restart": false, "data": {
      "a": 1, "api": "QELO.Test.Entries", "method": "echo", "version": 2}})");
  APIRunner::Exec(result, kEntries, 2, "echo", params, "alice");
  EXPECT_EQ(result, expected);
  result = "old";
  APIRunner::Exec(result, kEntries, 2, "echo", params, Parse(R"({"attr": 1})"), "alice");
  EXPECT_EQ(result, expected);
  result = "old";
  APIRunner::Exec(result, -1, kEntries, 2, "echo", params, Json::Value(), "alice");
  EXPECT_EQ(result, expected);
  EXPECT_EQ(Forks(), 0);
  const int output = memfd_create("output", MFD_CLOEXEC);
  APIRunner::Exec(result, output, kDownload, 1, "print", Parse(R"({"body": "b"})"), Json::Value(),
                  "alice");
  EXPECT_EQ(result["data"], Json::Value("printed"));
  EXPECT_EQ(lseek(output, 0, SEEK_END), 1);
  close(output);
  APIRunner::Exec(result, nullptr, 1, nullptr, Json::Value(), nullptr);
  EXPECT_EQ(result, Failure(101));
}

// The process around the call

TEST_F(Exec, DescriptionsAreFoundFromAnywhereAndTheWorkingDirectoryComesBack) {
  for (const ExecParam& param : {Call("echo", 1), Call("echo", 2), ExecParam(),
                                 Call("print", 1, "{}", kDownload).SetOutputFd(2)}) {
    APIRunner::Exec(param);
    EXPECT_EQ(std::filesystem::current_path(), directory);
  }
}

TEST_F(Exec, MissingDescriptionDirectoryIsLoggedAndTheAPIUnknown) {
  const std::string moved = std::string(Paths::kDescriptionDir, strlen(Paths::kDescriptionDir) - 1);
  std::filesystem::rename(moved, moved + ".moved");
  EXPECT_EQ(APIRunner::Exec(Call("echo"))["error"]["code"], Json::Value(102));
  std::filesystem::rename(moved + ".moved", moved);
  EXPECT_EQ(SyslogCapture::Count("cannot enter "), 1);
}

TEST_F(Exec, UserVariablesStaySetWhenThereWereNone) {
  APIRunner::Exec(Call("echo", 2));
  EXPECT_EQ(Variable("QELO_WEBAPI_USERNAME"), "alice");
  EXPECT_EQ(Variable("USERNAME"), "alice");
}

TEST_F(Exec, BothUserVariablesAreRestoredFromTheRunners) {
  setenv("QELO_WEBAPI_USERNAME", "carol", 1);
  APIRunner::Exec(Call("echo", 2));
  EXPECT_EQ(Variable("QELO_WEBAPI_USERNAME"), "carol");
  EXPECT_EQ(Variable("USERNAME"), "carol");
}

TEST_F(Exec, ChildLeavesTheUserVariablesAlone) {
  setenv("QELO_WEBAPI_USERNAME", "carol", 1);
  APIRunner::Exec(Call("echo", 1));
  EXPECT_EQ(Variable("QELO_WEBAPI_USERNAME"), "carol");
  EXPECT_EQ(Variable("USERNAME"), "before");
}

TEST_F(Exec, RunInAChildGivesNothingBack) {
  const ExecParam param = Call("echo", 2);
  ExecHandler handler(param);
  ASSERT_TRUE(handler.CheckParams());
  handler.PrepareReq();
  setenv("QELO_WEBAPI_USERNAME", "carol", 1);
  handler.Run(true);
  EXPECT_EQ(Variable("QELO_WEBAPI_USERNAME"), "alice");
  EXPECT_EQ(Variable("USERNAME"), "alice");
}

TEST_F(Exec, NoDescriptorStaysOpen) {
  const auto count = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"),
                         std::filesystem::directory_iterator());
  };
  const int output = memfd_create("output", MFD_CLOEXEC);
  const auto before = count();
  APIRunner::Exec(Call("echo", 1));
  APIRunner::Exec(Call("echo", 2));
  APIRunner::Exec(Call("print", 1, "{}", kDownload).SetOutputFd(output));
  APIRunner::Exec(Call("killed", 1, "{}", "QELO.Test.Losing"));
  platform->forkResult = -1;
  APIRunner::Exec(Call("echo", 1));
  APIRunner::Exec(Call("echo", 1).SetOutputFd(output));
  EXPECT_EQ(count(), before);
  close(output);
}

// Lost children

TEST_F(Exec, FailedForkIs117) {
  platform->forkResult = -1;
  for (const int output : {-1, 2}) {
    SyslogCapture::Clear();
    EXPECT_EQ(APIRunner::Exec(Call("echo", 1).SetOutputFd(output)), Failure(117));
    EXPECT_EQ(SyslogCapture::Count("ExecHandler.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("fork failed"), 1);
  }
}

/// Leaves so many descriptors to the process while it lives.
class FewDescriptors {
 public:
  explicit FewDescriptors(unsigned left) {
    getrlimit(RLIMIT_NOFILE, &former_);
    rlimit few = former_;
    for (few.rlim_cur = 0; left > 0; ++few.rlim_cur) {
      left -= fcntl(static_cast<int>(few.rlim_cur), F_GETFD) < 0 ? 1 : 0;
    }
    setrlimit(RLIMIT_NOFILE, &few);
  }
  FewDescriptors(const FewDescriptors&) = delete;
  FewDescriptors& operator=(const FewDescriptors&) = delete;
  ~FewDescriptors() { setrlimit(RLIMIT_NOFILE, &former_); }

 private:
  rlimit former_{};
};

TEST_F(Exec, WithoutDescriptorsItIs117) {
  // One is the working directory's, as long as the call lasts, and one more serves to read files.
  for (const auto& [output, left] : {std::pair(-1, 2u), {2, 2u}, {2, 4u}}) {
    SyslogCapture::Clear();
    const ExecParam param = Call("echo", 1).SetOutputFd(output);
    Json::Value result;
    {
      const FewDescriptors few(left);
      result = APIRunner::Exec(param);
    }
    EXPECT_EQ(result, Failure(117)) << output << " " << left;
    EXPECT_EQ(SyslogCapture::Count("ExecHandler.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("fork failed"), 1);
    EXPECT_EQ(std::filesystem::current_path(), directory);
  }
  EXPECT_EQ(Forks(), 0);
  const FewDescriptors enough(12);
  EXPECT_TRUE(APIRunner::Exec(Call("echo", 1).SetOutputFd(2))["success"].asBool());
}

TEST_F(Exec, LostChildIs117) {
  const int output = memfd_create("output", MFD_CLOEXEC);
  for (const char* loss : {"killed", "ended", "hangsUp", "rubbish", "scalar"}) {
    for (const int fd : {-1, output}) {
      SyslogCapture::Clear();
      const ExecParam param = Call(loss, 1, "{}", "QELO.Test.Losing").SetOutputFd(fd);
      EXPECT_EQ(APIRunner::Exec(param), Failure(117)) << loss;
      EXPECT_EQ(SyslogCapture::Count("ExecHandler.cpp:"), 1) << loss;
      EXPECT_EQ(SyslogCapture::Count("read json failed"), 1) << loss;
    }
  }
  close(output);
}

TEST_F(Exec, FourMebibytesArriveWhole) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "an ordinary user's pipes are limited by the system";
  }
  const Json::Value answer = APIRunner::Exec(Call("large", 1, R"({"size": 4194304})"));
  EXPECT_EQ(answer["data"].asString(), std::string(4194304, 'x'));
}

TEST_F(Exec, AnswerWithoutRoomIs117) {
  const int log = memfd_create("log", MFD_CLOEXEC);
  fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    bool good =
        geteuid() != 0 || (setgroups(0, nullptr) == 0 && setresgid(54321, 54321, 54321) == 0 &&
                           setresuid(54321, 54321, 54321) == 0);
    SyslogCapture::Copy() = log;
    Json::Value params;
    std::ifstream("/proc/sys/fs/pipe-max-size") >> params["size"];
    good = good && APIRunner::Exec(Call("large", 1, JsonHelper::toString(params))) == Failure(117);
    _exit(good ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
  std::string text(static_cast<size_t>(lseek(log, 0, SEEK_END)), '\0');
  EXPECT_EQ(pread(log, text.data(), text.size(), 0), static_cast<ssize_t>(text.size()));
  EXPECT_NE(text.find("write json failed"), std::string::npos) << text;
  close(log);
}

}  // namespace
}  // namespace QELO
