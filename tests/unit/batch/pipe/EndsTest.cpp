#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <set>
#include <string>

#include "tests/unit/batch/ChildProcess.h"
#include "webapi/Pipe.h"

namespace QELO {
namespace {

constexpr int kWriteEnd = 700;  ///< where the tests put a further holder of a write end
constexpr int kReadEnd = 701;

bool isOpen(int fd) {
  return fcntl(fd, F_GETFD) >= 0;
}

bool closesOnExec(int fd) {
  return (fcntl(fd, F_GETFD) & FD_CLOEXEC) != 0;
}

class PipeEnds : public testing::Test {
 protected:
  void SetUp() override { before_ = openDescriptors(); }
  void TearDown() override {
    close(kReadEnd);
    close(kWriteEnd);
  }
  size_t Opened() const { return openDescriptors().size() - before_.size(); }

 private:
  std::set<int> before_;
};

TEST_F(PipeEnds, NoneUntilInit) {
  Pipe pipe;
  EXPECT_EQ(Opened(), 0u);
  pipe.Close();
  pipe.Close();
  char buffer[8] = "1234567";
  EXPECT_LT(pipe.Read(buffer, 8), 0);
  EXPECT_EQ(std::string(buffer, 8), std::string(8, '\0'));
}

TEST_F(PipeEnds, ReadOnlyKeepsTheReadEndAlone) {
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  EXPECT_EQ(Opened(), 2u);
  pipe.ReadOnly(-1);
  EXPECT_EQ(Opened(), 1u);
  char buffer[8];
  EXPECT_EQ(pipe.Read(buffer, 8), 0);  // nobody can write any more
  EXPECT_FALSE(pipe.WriteJson(1));
}

TEST_F(PipeEnds, WriteOnlyKeepsTheWriteEndAlone) {
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  pipe.WriteOnly(-1);
  EXPECT_EQ(Opened(), 1u);
  char buffer[8];
  EXPECT_LT(pipe.Read(buffer, 8), 0);
  EXPECT_FALSE(pipe.WriteJson(1));  // nobody can read any more
}

TEST_F(PipeEnds, CloseClosesBoth) {
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  pipe.Close();
  EXPECT_EQ(Opened(), 0u);
}

TEST_F(PipeEnds, DestructorClosesBoth) {
  {
    Pipe pipe;
    ASSERT_TRUE(pipe.Init());
  }
  EXPECT_EQ(Opened(), 0u);
}

TEST_F(PipeEnds, SecondInitClosesTheFirstOnes) {
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  ASSERT_TRUE(pipe.Init());
  EXPECT_EQ(Opened(), 2u);
}

TEST_F(PipeEnds, AreAlsoWhereTheCallerWantsThem) {
  Pipe first, second;
  ASSERT_TRUE(first.InitStream());
  ASSERT_TRUE(second.InitStream());
  first.ReadOnly(kReadEnd);
  second.WriteOnly(kWriteEnd);
  EXPECT_TRUE(isOpen(kReadEnd));
  EXPECT_TRUE(isOpen(kWriteEnd));
  EXPECT_FALSE(closesOnExec(kWriteEnd));  // a program that is started may inherit it
  char byte = 0;
  EXPECT_EQ(read(kReadEnd, &byte, 1), 0);
}

TEST_F(PipeEnds, CloseOnExec) {
  for (const bool stream : {false, true}) {
    const std::set<int> before = openDescriptors();
    Pipe pipe;
    ASSERT_TRUE(stream ? pipe.InitStream() : pipe.Init());
    for (const int fd : openDescriptors()) {
      if (before.count(fd) == 0) {
        EXPECT_TRUE(closesOnExec(fd));
      }
    }
  }
}

TEST_F(PipeEnds, FailedInitLeavesThemAsTheyWere) {
  const int status = inChild([] {
    Pipe pipe;
    ASSERT_TRUE(pipe.Init());
    const std::set<int> before = openDescriptors();
    rlimit former{};
    getrlimit(RLIMIT_NOFILE, &former);
    const rlimit none{3, former.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &none), 0);
    EXPECT_FALSE(pipe.Init());
    EXPECT_FALSE(pipe.InitStream());
    setrlimit(RLIMIT_NOFILE, &former);
    EXPECT_EQ(openDescriptors(), before);
    pipe.WriteOnly(kWriteEnd);
    EXPECT_TRUE(isOpen(kWriteEnd));
  });
  EXPECT_EQ(status, 0);
}

TEST_F(PipeEnds, AreNeverStandardDescriptors) {
  const int status = inChild([] {
    const int errors = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 100);
    for (const bool stream : {false, true}) {
      close(0);
      close(1);
      close(2);
      Pipe pipe;
      const bool opened = stream ? pipe.InitStream() : pipe.Init();
      const bool free = !isOpen(0) && !isOpen(1) && !isOpen(2);
      dup2(errors, 1);
      dup2(errors, 2);
      EXPECT_TRUE(opened);
      EXPECT_TRUE(free);
    }
  });
  EXPECT_EQ(status, 0);
}

TEST_F(PipeEnds, StreamIsAPipe) {
  Pipe pipe;
  ASSERT_TRUE(pipe.InitStream());
  pipe.WriteOnly(kWriteEnd);
  struct stat info;
  ASSERT_EQ(fstat(kWriteEnd, &info), 0);
  EXPECT_TRUE(S_ISFIFO(info.st_mode));
}

TEST_F(PipeEnds, ReadZeroFillsTheBufferWhenFewerBytesArrive) {
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  const pid_t child = fork();
  if (child == 0) {
    pipe.WriteOnly(kWriteEnd);
    _exit(write(kWriteEnd, "ab", 2) == 2 ? 0 : 1);
  }
  EXPECT_EQ(waitForEnd(child), 0);
  char buffer[8];
  memset(buffer, 'z', sizeof buffer);
  EXPECT_EQ(pipe.Read(buffer, sizeof buffer), 2);
  EXPECT_EQ(std::string(buffer, 8), std::string("ab\0\0\0\0\0\0", 8));
}

}  // namespace
}  // namespace QELO
