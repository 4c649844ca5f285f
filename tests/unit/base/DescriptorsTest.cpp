// What is read from and written to descriptors, and what takes their place.

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "TemporaryDir.h"
#include "webapi/base/NullDevice.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

bool isNull(int descriptor) {
  struct stat info {};
  struct stat null {};
  return fstat(descriptor, &info) == 0 && stat("/dev/null", &null) == 0 &&
         info.st_rdev == null.st_rdev && S_ISCHR(info.st_mode);
}

bool isInherited(int descriptor) {
  return (fcntl(descriptor, F_GETFD) & FD_CLOEXEC) == 0;
}

/// The next number that the system would give.
int lowestFree() {
  const int descriptor = open("/", O_PATH | O_CLOEXEC);
  close(descriptor);
  return descriptor;
}

/// Runs a piece in a child, whose descriptors are its own. @return its exit status
template <typename Piece>
int inChild(Piece piece) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(piece());
  }
  int status = -1;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

using Descriptors = TemporaryDir;

TEST_F(Descriptors, OwnerClosesItsOwnOnce) {
  const int free = lowestFree();
  {
    UniqueFd first(open("/", O_PATH | O_CLOEXEC));
    ASSERT_EQ(first.Get(), free);
    UniqueFd second(std::move(first));
    EXPECT_FALSE(first);
    EXPECT_EQ(second.Get(), free);
    second = UniqueFd(open("/", O_PATH | O_CLOEXEC));
    EXPECT_NE(second.Get(), free);
  }
  EXPECT_EQ(lowestFree(), free);
}

TEST_F(Descriptors, NullDeviceTakesTheirPlace) {
  const int free = lowestFree();
  const UniqueFd first(open("/", O_PATH | O_CLOEXEC));
  const UniqueFd second(open("/", O_PATH | O_CLOEXEC));
  ASSERT_TRUE(PutNullOver({first.Get(), second.Get()}));
  EXPECT_TRUE(isNull(first.Get()) && isInherited(first.Get()));
  EXPECT_TRUE(isNull(second.Get()) && isInherited(second.Get()));
  EXPECT_EQ(lowestFree(), free + 2);
}

TEST_F(Descriptors, NullDeviceTakesThePlaceOfClosedOnes) {
  EXPECT_EQ(inChild([] {
              close(STDIN_FILENO);
              close(STDOUT_FILENO);
              close(STDERR_FILENO);
              const bool put = PutNullOver({STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO});
              const bool all =
                  isNull(STDIN_FILENO) && isNull(STDOUT_FILENO) && isNull(STDERR_FILENO);
              return put && all && isInherited(STDIN_FILENO) && isInherited(STDERR_FILENO) ? 0 : 1;
            }),
            0);
}

TEST_F(Descriptors, NullDeviceIsOpenedAsAskedFor) {
  const UniqueFd both(open("/", O_PATH | O_CLOEXEC));
  const UniqueFd input(open("/", O_PATH | O_CLOEXEC));
  ASSERT_TRUE(PutNullOver({both.Get()}) && PutNullOver({input.Get()}, O_RDONLY));
  EXPECT_EQ(write(both.Get(), "x", 1), 1);
  EXPECT_EQ(write(input.Get(), "x", 1), -1);
}

TEST_F(Descriptors, LetGoOfClosesWhereThereIsNoNullDevice) {
  const auto full = [](auto piece) {
    return inChild([&] {
      while (open("/", O_PATH | O_CLOEXEC) >= 0) {
      }
      return piece();
    });
  };
  EXPECT_EQ(full([] { return PutNullOver({STDIN_FILENO}) ? 1 : 0; }), 0);
  EXPECT_EQ(full([] {
              LetGoOf({STDIN_FILENO, STDOUT_FILENO});
              return fcntl(STDIN_FILENO, F_GETFD) < 0 && fcntl(STDOUT_FILENO, F_GETFD) < 0 ? 0 : 1;
            }),
            0);
}

TEST_F(Descriptors, RegularFileIsReadWithinItsLimit) {
  Write("file", std::string(5000, 'x'));
  UniqueFd file;
  struct stat info {};
  ASSERT_EQ(OpenRegularFile(AT_FDCWD, Path("file").c_str(), file, info), 0);
  EXPECT_EQ(info.st_size, 5000);
  std::string text;
  EXPECT_TRUE(ReadText(file.Get(), 5000, text));
  EXPECT_EQ(text.size(), 5000U);
  lseek(file.Get(), 0, SEEK_SET);
  EXPECT_FALSE(ReadText(file.Get(), 4999, text));
}

TEST_F(Descriptors, LinkIsFollowedOnlyWhenAskedFor) {
  Write("file", "text");
  std::filesystem::create_symlink(Path("file"), Path("link"));
  UniqueFd file;
  struct stat info {};
  EXPECT_EQ(OpenRegularFile(AT_FDCWD, Path("link").c_str(), file, info), ELOOP);
  EXPECT_FALSE(file);
  EXPECT_EQ(OpenRegularFile(AT_FDCWD, Path("link").c_str(), file, info, 0), 0);
  EXPECT_TRUE(file);
}

TEST_F(Descriptors, PipeAndDirectoryAreNoRegularFiles) {
  UniqueFd file;
  struct stat info {};
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
  EXPECT_EQ(OpenRegularFile(AT_FDCWD, Path("pipe").c_str(), file, info), EINVAL);
  EXPECT_EQ(OpenRegularFile(AT_FDCWD, directory_.c_str(), file, info), EINVAL);
  EXPECT_EQ(OpenRegularFile(AT_FDCWD, Path("missing").c_str(), file, info), ENOENT);
}

TEST_F(Descriptors, TextThatFillsAPipeWaitsForItsReader) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
  UniqueFd reader(ends[0]);
  UniqueFd writer(ends[1]);
  const std::string large(1 << 20, 'x');
  const pid_t child = fork();
  if (child == 0) {
    _exit(WriteText(writer.Get(), large) ? 0 : 1);
  }
  writer = UniqueFd();
  fcntl(reader.Get(), F_SETFL, 0);
  std::string text;
  EXPECT_TRUE(ReadText(reader.Get(), large.size(), text));
  EXPECT_EQ(text, large);
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
}

TEST_F(Descriptors, TextThatNobodyReadsIsNotWritten) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const UniqueFd writer(ends[1]);
  close(ends[0]);
  const auto former = signal(SIGPIPE, SIG_IGN);
  EXPECT_FALSE(WriteText(writer.Get(), "text"));
  signal(SIGPIPE, former);
}

}  // namespace
}  // namespace QELO
