// What a call by an API daemon sends, and what becomes of what comes back.

#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class DaemonRunner : public TestRunner {
 public:
  using APIRunner::ProcessSocket;
};

class DaemonExchange : public RunnerTest {
 protected:
  void SetUp() override {
    RunnerTest::SetUp();
    unsetenv("in_qeloapid");
    platform->daemonReply = kReply;
  }

  /// Prepares "run" with these attributes, as Process() does before it takes the road.
  void Prepare(const std::string& attributes = "{}",
               Json::Value params = Json::Value(Json::objectValue)) {
    Json::Value description = Description("state", attributes);
    description["socket"] = "daemon.sock";
    WriteDescription(description);
    MakeRequest("QELO.Test.Call", 1, "run", std::move(params));
    tested = std::make_unique<DaemonRunner>();
    EXPECT_TRUE(tested->CheckRequestParam(request.get(), response.get()));
    EXPECT_TRUE(tested->AddAPIInfo(request.get()));
    platform->calls.clear();
    SyslogCapture::Clear();
  }
  bool Process() { return tested->ProcessSocket(request.get(), response.get()); }

  void ExpectOneLine(const std::string& message) {
    ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
    const std::string text = SyslogCapture::Messages()[0].text;
    EXPECT_EQ(text.rfind("APIRunner.cpp:", 0), 0u) << text;
    EXPECT_EQ(text.substr(text.find(' ') + 1), message);
  }

  using Calls = std::vector<std::string>;
  static constexpr char kReply[] =
      R"({"headers": {"X-From": "daemon"}, "setCookie": [], "success": {}, "option": {}, "code": 0,
          "body": {"success": true, "data": "from the daemon"}})";
  std::unique_ptr<DaemonRunner> tested;
};

TEST_F(DaemonExchange, ReplyTakesTheResponsesPlace) {
  Prepare();
  response->SetHeader("X-Local", "lost");
  EXPECT_TRUE(Process());
  EXPECT_EQ(Data(), Json::Value("from the daemon"));
  EXPECT_EQ(response->GetError(), 0);
  EXPECT_EQ(response->GetHeader("X-From", ""), "daemon");
  EXPECT_FALSE(response->HasHeader("X-Local"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
  EXPECT_EQ(platform->calls, (Calls{"Connect(daemon.sock)", "Send()", "Recv()", "Disconnect()"}));
}

TEST_F(DaemonExchange, MessageHoldsBothRecordsWithThePresetError) {
  Prepare("{}", Parse(R"({"colour": "red", "list": [1, {"a": null}]})"));
  request->InitSession(Parse(R"({"username": "alice"})"));
  response->SetHeader("X-Local", "sent along");
  const Json::Value record = request->Serialize();
  EXPECT_TRUE(Process());
  const Json::Value message = Parse(platform->daemonMessage);
  EXPECT_EQ(message.getMemberNames(), (std::vector<std::string>{"req", "resp"}));
  EXPECT_EQ(message["req"], record);
  EXPECT_EQ(message["req"]["param"]["list"], Parse(R"([1, {"a": null}])"));
  EXPECT_EQ(message["resp"]["code"], Json::Value(117));
  EXPECT_EQ(message["resp"]["body"], Parse(R"({"success": false, "error": {"code": 117}})"));
  EXPECT_EQ(message["resp"]["headers"]["X-Local"], Json::Value("sent along"));
}

TEST_F(DaemonExchange, FailedConnectionIs117) {
  Prepare();
  platform->daemonConnects = false;
  EXPECT_FALSE(Process());
  EXPECT_EQ(response->GetError(), 117);
  ExpectOneLine("Failed to connect domain socket: daemon.sock\n");
  EXPECT_EQ(platform->calls, (Calls{"Connect(daemon.sock)", "Disconnect()"}));
}

TEST_F(DaemonExchange, MessageThatCannotBeSentIs117) {
  Prepare();
  platform->daemonSends = false;
  EXPECT_FALSE(Process());
  EXPECT_EQ(response->GetError(), 117);
  ExpectOneLine("Failed to send and recv data from socket: daemon.sock\n");
  EXPECT_EQ(platform->calls, (Calls{"Connect(daemon.sock)", "Send()", "Disconnect()"}));
}

TEST_F(DaemonExchange, MissingReplyIs117) {
  Prepare();
  platform->daemonAnswers = false;
  EXPECT_FALSE(Process());
  EXPECT_EQ(response->GetError(), 117);
  ExpectOneLine("Failed to send and recv data from socket: daemon.sock\n");
  EXPECT_EQ(platform->calls, (Calls{"Connect(daemon.sock)", "Send()", "Recv()", "Disconnect()"}));
}

TEST_F(DaemonExchange, ReplyThatIsNoJsonIs117) {
  for (const char* reply : {"", "no JSON", "{\"code\": 0", "{} {}"}) {
    Prepare();
    platform->daemonReply = reply;
    EXPECT_FALSE(Process()) << reply;
    EXPECT_EQ(response->GetError(), 117) << reply;
    ExpectOneLine("Failed to parse response from socket: daemon.sock\n");
  }
}

TEST_F(DaemonExchange, ReplyOfAnotherKindOfJsonHarmsNobody) {
  for (const char* reply : {"null", "5", "[]", "\"text\"", R"({"body": 5, "headers": []})"}) {
    Prepare();
    platform->daemonReply = reply;
    EXPECT_TRUE(Process()) << reply;
    EXPECT_EQ(response->GetError(), 0) << reply;
    EXPECT_FALSE(response->HasServerError()) << reply;
    EXPECT_TRUE(response->IsEnableOutput()) << reply;
  }
}

TEST_F(DaemonExchange, DeepestParameterAndAnswerPass) {
  Json::Value deep(7);
  for (int level = 0; level < JsonHelper::kMaxDepth; ++level) {
    Json::Value outer(Json::arrayValue);
    outer.append(deep);
    deep.swap(outer);
  }
  Json::Value params(Json::objectValue);
  params["deep"] = deep;
  Prepare("{}", params);
  platform->daemonReply =
      R"({"code": 0, "body": {"success": true, "data": )" + JsonHelper::toString(deep) + "}}";
  EXPECT_TRUE(Process());
  EXPECT_EQ(Data(), deep);
}

TEST_F(DaemonExchange, RefusedPermissionIsFinalAndNobodyIsAsked) {
  Prepare();
  tested->need = true;
  tested->permission = false;
  EXPECT_FALSE(Process());
  EXPECT_EQ(tested->asked, "need check skip ");
  EXPECT_EQ(response->GetError(), 105);
  EXPECT_EQ(platform->calls, Calls{});
}

TEST_F(DaemonExchange, RefusedPermissionThatIsSkippedPasses) {
  Prepare();
  tested->need = true;
  tested->permission = false;
  tested->skip = true;
  EXPECT_TRUE(Process());
  EXPECT_EQ(Data(), Json::Value("from the daemon"));
}

TEST_F(DaemonExchange, SharingRequestAsksTheSharingCheck) {
  Prepare();
  request->InitEnv(Parse(R"({"HTTP_X_QELO_SHARING": "abc"})"));
  tested->sharing = false;
  tested->need = true;
  EXPECT_FALSE(Process());
  EXPECT_EQ(tested->asked, "sharing skip ");
  EXPECT_EQ(platform->calls, Calls{});
}

TEST_F(DaemonExchange, UploadIsTakenBeforeTheDaemonIsAsked) {
  Prepare(R"({"allowUpload": true})");
  request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
  EXPECT_TRUE(Process());
  EXPECT_EQ(tested->asked, "need upload ");
  tested->upload = false;
  platform->calls.clear();
  response->SetError(444);
  EXPECT_FALSE(Process());
  EXPECT_EQ(platform->calls, Calls{});
  EXPECT_EQ(response->GetError(), 444);  // what the hook had set; nothing was preset yet
}

TEST_F(DaemonExchange, UploadToAMethodWithoutAllowUploadIsNotTaken) {
  Prepare();
  request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
  EXPECT_FALSE(Process());
  EXPECT_EQ(tested->asked, "need ");
  EXPECT_EQ(platform->calls, Calls{});
}

TEST_F(DaemonExchange, NothingOfThisProcessChanges) {
  platform->settings["enable_data_collect"] = "yes";
  Prepare(R"({"grantByDefault": true})");
  tested->Request()->SetAttr("_collector_count_webapi", true);
  EXPECT_TRUE(Process());
  EXPECT_EQ(platform->calls, (Calls{"Connect(daemon.sock)", "Send()", "Recv()", "Disconnect()"}));
}

TEST_F(DaemonExchange, ProcessTakesThisRoadWhenTheSocketIsThere) {
  Prepare();
  sockaddr_un address{AF_UNIX, "daemon.sock"};
  const int made = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  ASSERT_EQ(bind(made, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
  EXPECT_TRUE(tested->Process(request.get(), response.get()));
  EXPECT_EQ(Data(), Json::Value("from the daemon"));
  close(made);
  std::filesystem::remove("daemon.sock");
  std::ofstream("daemon.sock") << "a regular file";
  EXPECT_TRUE(tested->Process(request.get(), response.get()));
  EXPECT_EQ(Data()["code"], Json::Value(117));  // the method's, in this process
  EXPECT_EQ(SyslogCapture::Count("socket is not ready: daemon.sock\n"), 1);
}

TEST_F(DaemonExchange, DeadDaemonIsNoReasonToCallInProcess) {
  Prepare();
  sockaddr_un address{AF_UNIX, "daemon.sock"};
  const int made = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  ASSERT_EQ(bind(made, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
  close(made);
  platform->daemonConnects = false;
  EXPECT_FALSE(tested->Process(request.get(), response.get()));
  EXPECT_EQ(response->GetError(), 117);
}

}  // namespace
}  // namespace QELO
