#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <vector>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

constexpr int kExclusive = 1;

class Locks : public PrivateRoot {
 protected:
  static int Lock(int seconds, int* fd) {
    return QLIBCFileLockTimeByFile(Path("var/lock").c_str(), kExclusive, seconds, fd);
  }

  static double SecondsOf(const std::function<void()>& body) {
    const auto start = std::chrono::steady_clock::now();
    body();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  }

  static int ReadCount() {
    const std::string text = Read("var/count");
    return text.empty() ? 0 : std::stoi(text);
  }

  /// Adds one so many times, each under the lock. @return how many locks were refused
  static int AddOften(int times) {
    int refused = 0;
    for (int i = 0; i < times; ++i) {
      int fd = -1;
      if (Lock(2, &fd) < 0) {
        ++refused;
        continue;
      }
      Write("var/count", std::to_string(ReadCount() + 1));
      QLIBCFileUnlockByFile(fd);
    }
    return refused;
  }
};

TEST_F(Locks, FileIsCreatedForItsOwnerAlone) {
  int fd = -1;
  ASSERT_GE(Lock(0, &fd), 0);
  EXPECT_EQ(Status("var/lock").st_mode, S_IFREG | 0600U);
  EXPECT_NE(fcntl(fd, F_GETFD) & FD_CLOEXEC, 0);
  EXPECT_EQ(QLIBCFileUnlockByFile(fd), 0);
}

TEST_F(Locks, SecondHolderIsRefusedAtOnceWithoutWaiting) {
  int first = -1;
  int second = 7;
  ASSERT_GE(Lock(0, &first), 0);
  const double seconds = SecondsOf([&] { EXPECT_LT(Lock(0, &second), 0); });
  EXPECT_EQ(second, -1);
  EXPECT_LT(seconds, 0.5);
  QLIBCFileUnlockByFile(first);
  EXPECT_GE(Lock(0, &second), 0);
  QLIBCFileUnlockByFile(second);
}

TEST_F(Locks, WaitingEndsAfterTheGivenTime) {
  int first = -1;
  int second = -1;
  ASSERT_GE(Lock(0, &first), 0);
  const double seconds = SecondsOf([&] { EXPECT_LT(Lock(1, &second), 0); });
  EXPECT_GE(seconds, 1.0);
  EXPECT_LT(seconds, 3.0);
  QLIBCFileUnlockByFile(first);
}

TEST_F(Locks, WaitingEndsWithTheLockWhenItIsReleased) {
  int first = -1;
  ASSERT_GE(Lock(0, &first), 0);
  const pid_t child = fork();
  if (child == 0) {
    close(first);
    int second = -1;
    _exit(Lock(10, &second) >= 0 ? 0 : 1);
  }
  usleep(100'000);
  EXPECT_EQ(QLIBCFileUnlockByFile(first), 0);
  int status = -1;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

TEST_F(Locks, UnlockEndsTheLockWhileAForkedChildStillHoldsTheFile) {
  int fd = -1;
  ASSERT_GE(Lock(0, &fd), 0);
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  const pid_t child = fork();
  if (child == 0) {
    close(ends[1]);
    char byte = 0;
    _exit(static_cast<int>(read(ends[0], &byte, 1)));
  }
  EXPECT_EQ(QLIBCFileUnlockByFile(fd), 0);
  int second = -1;
  EXPECT_GE(Lock(0, &second), 0);
  QLIBCFileUnlockByFile(second);
  close(ends[0]);
  close(ends[1]);
  waitpid(child, nullptr, 0);
}

TEST_F(Locks, UnlockOfNoDescriptorFails) {
  EXPECT_LT(QLIBCFileUnlockByFile(-1), 0);
}

TEST_F(Locks, SymbolicLinkIsRefused) {
  Write("var/target", "");
  ASSERT_EQ(symlink("target", Path("var/lock").c_str()), 0);
  int fd = 7;
  EXPECT_LT(Lock(0, &fd), 0);
  EXPECT_EQ(fd, -1);
}

TEST_F(Locks, MissingDirectoryAndUnknownTypeAreRefused) {
  int fd = 7;
  EXPECT_LT(QLIBCFileLockTimeByFile(Path("missing/lock").c_str(), kExclusive, 0, &fd), 0);
  EXPECT_EQ(fd, -1);
  EXPECT_LT(QLIBCFileLockTimeByFile(Path("var/lock").c_str(), 0, 0, &fd), 0);
  EXPECT_EQ(fd, -1);
  EXPECT_FALSE(std::filesystem::exists(Path("var/lock")));
}

TEST_F(Locks, SixtyFourProcessesLoseNothingThatWasNotRefused) {
  constexpr int kProcesses = 64;
  constexpr int kTimes = 200;
  std::vector<pid_t> children;
  for (int i = 0; i < kProcesses; ++i) {
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
      _exit(AddOften(kTimes));
    }
    children.push_back(child);
  }
  int refused = 0;
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFEXITED(status));
    refused += WEXITSTATUS(status);
  }
  EXPECT_EQ(ReadCount() + refused, kProcesses * kTimes);
  EXPECT_GT(ReadCount(), kProcesses * kTimes / 2);
}

}  // namespace
