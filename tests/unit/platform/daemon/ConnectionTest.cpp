// Messages over real sockets.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "webapi/platform/Daemon.h"

namespace qelodaemon {
namespace {

using std::chrono::milliseconds;
using Clock = std::chrono::steady_clock;

constexpr Limits kShort{milliseconds(50), milliseconds(50), milliseconds(50)};

/// One that can be taken apart.
class OpenConnection : public SockConnection {
 public:
  using SockConnection::SockConnection;
  int Release() { return std::exchange(descriptor_, -1); }
};

/// Both ends of a connection.
class DaemonMessages : public testing::Test {
 protected:
  void SetUp() override {
    int ends[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    left = std::make_unique<OpenConnection>(ends[0], kShort);
    raw = ends[1];
  }
  void TearDown() override { CloseRaw(); }
  void CloseRaw() {
    if (raw >= 0) {
      close(raw);
      raw = -1;
    }
  }
  /// Sends bytes that are no message, and expects that none is received.
  void ExpectRefused(const std::string& bytes, int error) {
    ASSERT_EQ(write(raw, bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
    std::string received = "as before";
    EXPECT_FALSE(left->Recv(received));
    EXPECT_EQ(errno, error);
    EXPECT_EQ(received, "as before");
  }

  std::unique_ptr<OpenConnection> left;
  int raw = -1;
};

TEST_F(DaemonMessages, OneReceiveYieldsOneSend) {
  SockConnection right(dup(raw), kShort);
  const std::vector<std::string> messages{"first", "", std::string("a\0b", 3), "last"};
  for (const std::string& message : messages) {
    EXPECT_TRUE(left->Send(message));
  }
  for (const std::string& message : messages) {
    std::string received = "as before";
    EXPECT_TRUE(right.Recv(received));
    EXPECT_EQ(received, message);
  }
}

TEST_F(DaemonMessages, LengthStandsInFrontHighestByteFirst) {
  EXPECT_TRUE(left->Send("abc"));
  char bytes[16];
  EXPECT_EQ(read(raw, bytes, sizeof bytes), 7);
  EXPECT_EQ(std::string(bytes, 7), std::string("\0\0\0\3abc", 7));
}

TEST_F(DaemonMessages, LargeMessageArrivesWholeThroughASmallBuffer) {
  std::string message(5 << 20, 'x');
  message.back() = 'y';
  const pid_t child = fork();
  if (child == 0) {
    SockConnection right(raw);
    std::string received;
    _exit(right.Recv(received) && received == message ? 0 : 1);
  }
  Limits patient;
  patient.send = std::chrono::seconds(20);
  EXPECT_TRUE(SockConnection(left->Release(), patient).Send(message));
  int status = -1;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

TEST_F(DaemonMessages, PeerThatClosesIsNoMessage) {
  CloseRaw();
  std::string received = "as before";
  EXPECT_FALSE(left->Recv(received));
  EXPECT_EQ(received, "as before");
}

TEST_F(DaemonMessages, PeerThatClosesWithinAMessageIsNone) {
  ASSERT_EQ(write(raw, "\0\0\0\5abc", 7), 7);
  CloseRaw();
  std::string received = "as before";
  EXPECT_FALSE(left->Recv(received));
  EXPECT_EQ(errno, EPIPE);
  EXPECT_EQ(received, "as before");
}

TEST_F(DaemonMessages, SilentPeerIsWaitedForNoLongerThanTheLimit) {
  const auto start = Clock::now();
  ExpectRefused("", ETIMEDOUT);
  EXPECT_GE(Clock::now() - start, milliseconds(50));
  EXPECT_LT(Clock::now() - start, std::chrono::seconds(10));
}

TEST_F(DaemonMessages, PeerThatStopsWithinAMessageIsNotWaitedForLonger) {
  ExpectRefused(std::string("\0\0\0\5abc", 7), ETIMEDOUT);
}

TEST_F(DaemonMessages, AnnouncedLengthBeyondTheLimitIsRefusedAtOnce) {
  ExpectRefused(std::string("\4\0\0\1", 4), EMSGSIZE);
}

TEST_F(DaemonMessages, MessageBeyondTheLimitIsNotBegun) {
  EXPECT_FALSE(left->Send(std::string(kLargestMessage + 1, 'x')));
  EXPECT_EQ(errno, EMSGSIZE);
  char byte;
  EXPECT_EQ(recv(raw, &byte, 1, MSG_DONTWAIT), -1);
  EXPECT_EQ(errno, EAGAIN);
}

TEST_F(DaemonMessages, PeerThatTakesNothingEndsTheSending) {
  EXPECT_FALSE(left->Send(std::string(8 << 20, 'x')));
  EXPECT_EQ(errno, ETIMEDOUT);
}

TEST_F(DaemonMessages, PeerThatIsGoneEndsTheSendingAndNotTheProcess) {
  CloseRaw();
  EXPECT_FALSE(left->Send("text"));
  EXPECT_EQ(errno, EPIPE);
}

TEST(DaemonConnection, WithoutADescriptorNothingWorks) {
  SockConnection none(-1, kShort);
  std::string received;
  EXPECT_FALSE(none.Send("x"));
  EXPECT_FALSE(none.Recv(received));
  DomainSockConnection unconnected("/nonexistent/x.sock", kShort);
  EXPECT_FALSE(unconnected.Send("x"));
  EXPECT_FALSE(unconnected.Recv(received));
}

/// A listener at a path of its own.
class DaemonListener : public testing::Test {
 protected:
  void SetUp() override {
    std::string pattern = std::filesystem::temp_directory_path() / "daemon.XXXXXX";
    directory = mkdtemp(pattern.data());
    path = directory / "daemon.sock";
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    ASSERT_EQ(bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    ASSERT_EQ(listen(listener, 0), 0);
  }
  void TearDown() override {
    close(listener);
    std::filesystem::remove_all(directory);
  }

  std::filesystem::path directory;
  std::string path;
  int listener = -1;
};

TEST_F(DaemonListener, IsReached) {
  DomainSockConnection connection(path, kShort);
  ASSERT_TRUE(connection.Connect());
  SockConnection accepted(accept(listener, nullptr, nullptr), kShort);
  EXPECT_TRUE(connection.Send("question"));
  std::string received;
  EXPECT_TRUE(accepted.Recv(received));
  EXPECT_EQ(received, "question");
  EXPECT_TRUE(accepted.Send("answer"));
  EXPECT_TRUE(connection.Recv(received));
  EXPECT_EQ(received, "answer");
}

TEST_F(DaemonListener, WhoseQueueIsFullIsWaitedForNoLongerThanTheLimit) {
  DomainSockConnection first(path, kShort);
  ASSERT_TRUE(first.Connect());
  DomainSockConnection second(path, kShort);
  EXPECT_FALSE(second.Connect());
  EXPECT_EQ(errno, EAGAIN);
}

TEST_F(DaemonListener, ThatIsGoneRefuses) {
  close(listener);
  listener = -1;
  DomainSockConnection connection(path, kShort);
  EXPECT_FALSE(connection.Connect());
  EXPECT_EQ(errno, ECONNREFUSED);
}

TEST_F(DaemonListener, PathThatCannotBeOneIsRefused) {
  for (const std::string& bad : {std::string(), std::string(108, 'x'), path + std::string(1, '\0'),
                                 std::string("/nonexistent/daemon.sock")}) {
    DomainSockConnection connection(bad, kShort);
    EXPECT_FALSE(connection.Connect()) << bad;
  }
}

TEST_F(DaemonListener, ConnectionIsClosedAtItsEndAndNotInheritedByPrograms) {
  int lowest = dup(0);
  close(lowest);
  {
    DomainSockConnection connection(path, kShort);
    ASSERT_TRUE(connection.Connect());
    EXPECT_EQ(fcntl(lowest, F_GETFD), FD_CLOEXEC);
  }
  EXPECT_EQ(fcntl(lowest, F_GETFD), -1);
}

}  // namespace
}  // namespace qelodaemon
