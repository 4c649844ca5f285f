// The child of a call from code: large and deep results, results that cannot be sent, and what is
// logged of all that.

#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <regex>
#include <sstream>

#include "tests/unit/batch/ChildProcess.h"
#include "tests/unit/runner/exec/Fixture.h"

namespace QELO {
namespace {

constexpr unsigned kPatienceSeconds = 20;

class ExecChild : public ExecTest {
 protected:
  void SetUp() override {
    ExecTest::SetUp();
    log_ = memfd_create("log", MFD_CLOEXEC);
    SyslogCapture::Copy() = log_;
    output_ = memfd_create("output", MFD_CLOEXEC);
  }
  void TearDown() override {
    SyslogCapture::Copy() = -1;
    close(log_);
    close(output_);
    ExecTest::TearDown();
  }

  static std::string Content(int file) {
    std::string text(static_cast<size_t>(lseek(file, 0, SEEK_END)), '\0');
    EXPECT_EQ(pread(file, text.data(), text.size(), 0), static_cast<ssize_t>(text.size()));
    return text;
  }

  /// How many lines of this and all child processes are exactly such an error.
  int Errors(const std::string& source, const std::string& message) const {
    std::istringstream lines(Content(log_));
    const std::regex expected("<3>" + source + ":[1-9][0-9]* " + message);
    int count = 0;
    for (std::string line; std::getline(lines, line);) {
      count += std::regex_match(line, expected) ? 1 : 0;
    }
    return count;
  }
  int Errors(const std::string& message) const { return Errors("ExecHandler.cpp", message); }

  int output_ = -1;

 private:
  int log_ = -1;
};

TEST_F(ExecChild, LargeResultArrivesBesideAnOutputAlsoWhereRootIsKeptToTheLimits) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "an ordinary user's pipes are limited by the system";
  }
  for (const char* method : {"large", "shared"}) {
    const int status = inChild([&] {
      alarm(kPatienceSeconds);  // when parent and child wait for each other
      ASSERT_TRUE(dropCapability(CAP_SYS_RESOURCE) && dropCapability(CAP_NET_ADMIN));
      const bool prints = std::string(method) == "shared";
      const ExecParam param =
          Call(method, 1, R"({"size": 5000000, "body": "printed"})", prints ? kDownload : kEntries);
      const Json::Value result = APIRunner::Exec(ExecParam(param).SetOutputFd(output_));
      EXPECT_EQ(result["data"].asString().size(), 5000000u);
      EXPECT_EQ(Content(output_), prints ? "printed" : "");
    });
    EXPECT_EQ(status, 0) << method;
  }
}

TEST_F(ExecChild, ResultNestedTooDeepForAMessageIs117) {
  for (const int fd : {-1, output_}) {
    const ExecParam param = Call("deep", 1, R"({"levels": 300})").SetOutputFd(fd);
    EXPECT_EQ(APIRunner::Exec(param), Failure(117));
  }
  EXPECT_EQ(Errors("APIUtilsPrivate.cpp", "json nests deeper than 256"), 2);
  EXPECT_EQ(Errors("write json failed"), 2);
  EXPECT_EQ(Errors("read json failed"), 0);
  EXPECT_TRUE(APIRunner::Exec(Call("deep", 2, R"({"levels": 300})"))["success"].asBool());
  EXPECT_TRUE(APIRunner::Exec(Call("deep", 1, R"({"levels": 255})"))["success"].asBool());
}

TEST_F(ExecChild, ThatBeganAMessageSendsNoOther) {
  // In the place of the pipe a socket that takes the length and refuses the text, which is too long
  // for one packet.
  int sockets[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, sockets), 0);
  const std::set<int> before = openDescriptors();
  platform->resetCredentials = [&](const std::string&, bool) {
    for (const int fd : openDescriptors()) {
      struct stat info {};
      if (before.count(fd) == 0 && fstat(fd, &info) == 0 &&
          (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode))) {
        dup2(sockets[1], fd);
      }
    }

    return true;
  };
  EXPECT_EQ(APIRunner::Exec(Call("large", 1, R"({"size": 4194304})")), Failure(117));
  while (wait(nullptr) > 0) {
  }
  EXPECT_EQ(Errors("write json failed"), 1);
  EXPECT_EQ(Errors("read json failed"), 1);
  char packet[64];
  EXPECT_EQ(read(sockets[0], packet, sizeof packet), 4);
  EXPECT_LT(read(sockets[0], packet, sizeof packet), 0);
  EXPECT_EQ(errno, EAGAIN);
  close(sockets[0]);
  close(sockets[1]);
}

TEST_F(ExecChild, EveryMessageIsAnErrorWithItsSourceAndLine) {
  APIRunner::Exec(ExecParam());
  EXPECT_EQ(Errors("missing parameter\\."), 1);
  APIRunner::Exec(Call("killed", 1, "{}", "QELO.Test.Losing"));
  EXPECT_EQ(Errors("read json failed"), 1);
  EXPECT_EQ(Errors("APIUtilsPrivate.cpp", "protocol failed"), 1);
  APIRunner::Exec(Call("deep", 1, R"({"levels": 300})"));
  EXPECT_EQ(Errors("write json failed"), 1);
  const int readOnly = open("/dev/null", O_RDONLY | O_CLOEXEC);
  APIRunner::Exec(Call("print", 1, R"({"body": "x"})", kDownload).SetOutputFd(readOnly));
  close(readOnly);
  EXPECT_EQ(Errors("write output failed \\[.*\\]"), 1);
  platform->forkResult = -1;
  APIRunner::Exec(Call("echo", 1));
  EXPECT_EQ(Errors("fork failed"), 1);
}

}  // namespace
}  // namespace QELO
