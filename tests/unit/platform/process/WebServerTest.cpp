#include "webapi/platform/WebServer.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"

namespace {

class WebServer : public PrivateRoot {
 protected:
  void TearDown() override {
    if (server_ > 0) {
      kill(server_, SIGKILL);
      waitpid(server_, nullptr, 0);
    }
  }

  static void Configure(const std::string& signal = "USR1") {
    Set({{"web_server_pid_file", "/run/server.pid"}, {"web_server_restart_signal", signal}});
  }

  /// A process that ends by the first of the three signals; the pid file names it.
  void StartServer() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int number : {SIGHUP, SIGUSR1, SIGUSR2}) {
      sigaddset(&signals, number);
    }
    sigset_t before;
    sigprocmask(SIG_BLOCK, &signals, &before);
    server_ = fork();
    if (server_ == 0) {
      int got = 0;
      sigwait(&signals, &got);
      _exit(got);
    }
    sigprocmask(SIG_SETMASK, &before, nullptr);
    Write("run/server.pid", std::to_string(server_) + "\n", 0644);
  }

  int SignalThatTheServerGot() {
    int status = 0;
    EXPECT_EQ(waitpid(server_, &status, 0), server_);
    server_ = 0;
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  static bool Restart() {
    const qelow3::Engine engine;
    return qelow3::ARDO(engine).RestartService();
  }

  pid_t server_ = 0;
};

TEST_F(WebServer, RestartSendsTheSignalThatIsSet) {
  for (const auto& [name, number] :
       {std::pair("USR1", SIGUSR1), std::pair("USR2", SIGUSR2), std::pair("HUP", SIGHUP)}) {
    Configure(name);
    StartServer();
    EXPECT_TRUE(Restart());
    EXPECT_EQ(SignalThatTheServerGot(), number);
  }
}

TEST_F(WebServer, EngineThrowsWithoutSettings) {
  Set({});
  EXPECT_THROW(qelow3::Engine(), std::runtime_error);
  Set({{"web_server_pid_file", "/run/server.pid"}});
  EXPECT_THROW(qelow3::Engine(), std::runtime_error);
  Set({{"web_server_restart_signal", "USR1"}});
  EXPECT_THROW(qelow3::Engine(), std::runtime_error);
}

TEST_F(WebServer, EngineThrowsOnSettingsThatMakeNoSense) {
  for (const char* signal : {"KILL", "9", "usr1", "SIGUSR1"}) {
    Configure(signal);
    EXPECT_THROW(qelow3::Engine(), std::runtime_error) << signal;
  }
  Set({{"web_server_pid_file", "server.pid"}, {"web_server_restart_signal", "USR1"}});
  EXPECT_THROW(qelow3::Engine(), std::runtime_error);
}

TEST_F(WebServer, RestartFailsWithoutAProcessInThePidFile) {
  Configure();
  EXPECT_FALSE(Restart());
  int failures = 1;
  for (const char* text : {"", "0", "1", "-1", "-5", "x", "12x", "99999999999", "\n"}) {
    Write("run/server.pid", text, 0644);
    EXPECT_FALSE(Restart()) << text;
    ++failures;
  }
  EXPECT_EQ(SyslogCapture::Count("no process in " + Path("run/server.pid")), failures);
}

TEST_F(WebServer, RestartFailsWhenTheProcessIsGone) {
  Configure();
  StartServer();
  kill(server_, SIGUSR1);
  SignalThatTheServerGot();
  EXPECT_FALSE(Restart());
  EXPECT_EQ(SyslogCapture::Count("cannot signal the web server, process "), 1);
}

TEST_F(WebServer, PidFileThatOthersMayWriteIsNotBelieved) {
  Configure();
  StartServer();
  ASSERT_EQ(chmod(Path("run/server.pid").c_str(), 0666), 0);
  EXPECT_FALSE(Restart());
  ASSERT_EQ(rename(Path("run/server.pid").c_str(), Path("run/real").c_str()), 0);
  ASSERT_EQ(chmod(Path("run/real").c_str(), 0644), 0);
  ASSERT_EQ(symlink("real", Path("run/server.pid").c_str()), 0);
  EXPECT_FALSE(Restart());
}

TEST_F(WebServer, PidFileOfAnotherUserIsNotBelieved) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives files away";
  }
  Configure();
  StartServer();
  ASSERT_EQ(chown(Path("run/server.pid").c_str(), 1002, 1002), 0);
  EXPECT_FALSE(Restart());
}

}  // namespace
