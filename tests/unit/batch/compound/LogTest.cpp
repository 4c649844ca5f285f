// What the handler of compound requests and its children log, each an error of one source; and what
// a child sends when its answer cannot be sent.

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <regex>
#include <sstream>

#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

class CompoundLog : public CompoundTest {
 protected:
  static Json::Value Losing(const char* method) {
    return Entry(method, 1, "{}", "QELO.Test.Losing");
  }

  /// Whether a line of parent or children is exactly such an error of "CompoundHandler.cpp".
  bool HasError(const std::string& message) const {
    return HasError("CompoundHandler.cpp", message);
  }
  bool HasError(const std::string& source, const std::string& message) const {
    std::istringstream lines(Log());
    const std::regex expected("<3>" + source + ":[1-9][0-9]* " + message);
    for (std::string line; std::getline(lines, line);) {
      if (std::regex_match(line, expected)) {
        return true;
      }
    }
    return false;
  }
};

TEST_F(CompoundLog, EveryMessageIsAnErrorWithItsSourceAndLine) {
  RunCompound(Json::Value());
  EXPECT_TRUE(HasError("ParseParams failed"));
  RunCompound(List({Losing("killed"), Losing("rubbish")}));
  EXPECT_TRUE(HasError("read compound json failed"));
  platform->forkResult = -1;
  RunCompound(List({Entry("echo")}));
  EXPECT_TRUE(HasError("fork Fail"));
  platform->forkResult = -2;
  RunCompound(List({Entry("deep", 1, R"({"levels": 300})")}));
  EXPECT_TRUE(HasError("APIUtilsPrivate.cpp", "json nests deeper than 256"));
  EXPECT_TRUE(HasError("write json failed"));
  const int status = inChild([&] {
    const rlimit limit{8, 8};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &limit), 0);
    Json::Value list(Json::arrayValue);
    for (int i = 0; i < 8; ++i) {
      list.append(Entry("echo"));
    }
    RunCompound(list, kParallel);
  });
  EXPECT_EQ(status, 0);
  EXPECT_TRUE(HasError("Pipe init failed"));
  EXPECT_TRUE(HasError("pipe init Fail"));
}

/// In a child, puts a socket of the test's in the place of every pipe's write end.
struct Diverting : TestRunner {
  bool NeedPermission(APIRequest*) override {
    for (const int fd : openDescriptors()) {
      struct stat info {};
      if (before.count(fd) == 0 && fstat(fd, &info) == 0 &&
          (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode))) {
        dup2(socket, fd);
      }
    }
    return false;
  }
  std::set<int> before;
  int socket = -1;
};

TEST_F(CompoundLog, ChildThatBeganAMessageSendsNoOther) {
  // The socket takes the length and refuses the text, which is too long for one packet.
  int sockets[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, sockets), 0);
  RunCompound(List({Entry("echo", 2)}));  // loads the library
  auto diverting = std::make_unique<Diverting>();
  diverting->before = openDescriptors();
  diverting->socket = sockets[1];
  runner = std::move(diverting);
  const Json::Value result = RunCompound(List({Entry("large", 1, R"({"size": 4194304})")}));
  while (wait(nullptr) > 0) {  // its answer is given up as soon as the pipe's end is replaced
  }
  EXPECT_TRUE(result[0].isNull());
  EXPECT_EQ(Logged("write json failed"), 1);
  EXPECT_EQ(Logged("read compound json failed"), 1);
  char packet[64];
  EXPECT_EQ(read(sockets[0], packet, sizeof packet), 4);
  EXPECT_LT(read(sockets[0], packet, sizeof packet), 0);
  EXPECT_EQ(errno, EAGAIN);
  close(sockets[0]);
  close(sockets[1]);
}

}  // namespace
}  // namespace QELO
