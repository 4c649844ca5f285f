// Which calls go to an API daemon.

#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class DaemonChoice : public RunnerTest {
 protected:
  void SetUp() override {
    RunnerTest::SetUp();
    unsetenv("in_qeloapid");
    MakeSocket("daemon.sock");
  }
  void TearDown() override {
    unsetenv("in_qeloapid");
    RunnerTest::TearDown();
  }

  static void MakeSocket(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    const int made = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    ASSERT_EQ(bind(made, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    close(made);  // the file stays
  }

  /// Asks for "run" with the attributes, of a description with these members.
  bool Ask(const std::string& members, const std::string& attributes = "{}") {
    Json::Value description = Description("state", attributes);
    const Json::Value further = Parse(members);
    for (const std::string& name : further.getMemberNames()) {
      description[name] = further[name];
    }
    WriteDescription(description);
    MakeRequest("QELO.Test.Call", 1, "run");
    TestRunner tested;
    EXPECT_TRUE(tested.CheckRequestParam(request.get(), response.get()));
    EXPECT_TRUE(tested.AddAPIInfo(request.get()));
    SyslogCapture::Clear();
    const bool possible = tested.CanProcessSocket(request.get());
    EXPECT_EQ(tested.asked, "");
    return possible;
  }

  static constexpr char kSocket[] = R"({"socket": "daemon.sock"})";
};

TEST_F(DaemonChoice, SocketThatIsThereIsTaken) {
  EXPECT_TRUE(Ask(kSocket));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(DaemonChoice, NothingIsForwardedWithinADaemonWhateverTheVariableHolds) {
  for (const char* value : {"", "0", "1"}) {
    setenv("in_qeloapid", value, 1);
    EXPECT_FALSE(Ask(kSocket)) << value;
    EXPECT_FALSE(Ask(R"({"socket": "missing.sock"})")) << value;
    EXPECT_TRUE(SyslogCapture::Messages().empty());
  }
}

TEST_F(DaemonChoice, MethodRunsInProcessWithinADaemon) {
  for (const bool within : {false, true}) {
    Json::Value description = Description("state");
    description["socket"] = "daemon.sock";
    WriteDescription(description);
    MakeRequest("QELO.Test.Call", 1, "run");
    within ? setenv("in_qeloapid", "", 1) : unsetenv("in_qeloapid");
    TestRunner tested;
    platform->daemonConnects = false;
    EXPECT_EQ(tested.Process(request.get(), response.get()), within);
    EXPECT_EQ(Data().isObject(), within);
    EXPECT_EQ(response->GetError(), within ? 0 : 117);
  }
}

TEST_F(DaemonChoice, DescriptionWithoutASocketStaysInProcessInSilence) {
  for (const char* members :
       {"{}", R"({"socket": ""})", R"({"socket": null})", R"({"socket": ["daemon.sock"]})"}) {
    EXPECT_FALSE(Ask(members)) << members;
    EXPECT_TRUE(SyslogCapture::Messages().empty()) << members;
  }
}

TEST_F(DaemonChoice, DescriptionTurnsItOffBeforeTheSocketIsLookedFor) {
  EXPECT_FALSE(Ask(R"({"socket": "missing.sock", "disableSocket": true})"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
  EXPECT_FALSE(Ask(R"({"socket": "daemon.sock", "disableSocket": true})"));
  EXPECT_TRUE(Ask(R"({"socket": "daemon.sock", "disableSocket": false})"));
  EXPECT_TRUE(Ask(R"({"socket": "daemon.sock", "disableSocket": "yes"})"));
}

TEST_F(DaemonChoice, PathWithoutASocketIsLogged) {
  Write("file", "");
  std::filesystem::create_directory("directory");
  for (const char* path : {"file", "directory", "missing.sock", "file/below"}) {
    EXPECT_FALSE(Ask(R"({"socket": ")" + std::string(path) + R"("})")) << path;
    ASSERT_EQ(SyslogCapture::Messages().size(), 1u) << path;
    const SyslogCapture::Message& message = SyslogCapture::Messages()[0];
    EXPECT_EQ(message.priority, LOG_ERR);
    EXPECT_EQ(message.text.rfind("APIRunner.cpp:", 0), 0u) << message.text;
    EXPECT_NE(message.text.find(" socket is not ready: " + std::string(path) + "\n"),
              std::string::npos)
        << message.text;
  }
}

TEST_F(DaemonChoice, LinkToASocketIsOne) {
  std::filesystem::create_symlink("daemon.sock", "link.sock");
  EXPECT_TRUE(Ask(R"({"socket": "link.sock"})"));
}

TEST_F(DaemonChoice, UploadGoesThereUnlessTheMethodReadsItItself) {
  EXPECT_TRUE(Ask(kSocket, R"({"allowUpload": true})"));
  EXPECT_TRUE(Ask(kSocket, R"({"deferUpload": true})"));
  EXPECT_FALSE(Ask(kSocket, R"({"allowUpload": true, "deferUpload": true})"));
}

TEST_F(DaemonChoice, DownloadNeverGoesThere) {
  EXPECT_FALSE(Ask(kSocket, R"({"allowDownload": true})"));
  EXPECT_FALSE(Ask(kSocket, R"({"allowDownload": true, "disableSocket": false})"));
}

TEST_F(DaemonChoice, MethodTurnsItOffForItself) {
  EXPECT_FALSE(Ask(kSocket, R"({"disableSocket": true})"));
  EXPECT_TRUE(Ask(kSocket, R"({"disableSocket": false})"));
  EXPECT_TRUE(Ask(kSocket, R"("no object")"));
}

TEST_F(DaemonChoice, MethodWithoutAttributesHasTheDefaults) {
  WriteLibDef(R"({"methods": {"disableSocket": true}})");
  Json::Value description = Description("state");
  description["socket"] = "daemon.sock";
  description["methods"]["1"] = Parse(R"(["run", {"other": {}}])");
  WriteDescription(description);
  TestRunner tested;
  for (const auto& [method, expected] : {std::pair("run", false), std::pair("other", true)}) {
    MakeRequest("QELO.Test.Call", 1, method);
    EXPECT_TRUE(tested.CheckRequestParam(request.get(), response.get()));
    EXPECT_TRUE(tested.AddAPIInfo(request.get()));
    EXPECT_EQ(tested.CanProcessSocket(request.get()), expected) << method;
  }
}

}  // namespace
}  // namespace QELO
