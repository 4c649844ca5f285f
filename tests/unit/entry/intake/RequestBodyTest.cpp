#include "webapi/entry/intake/RequestBody.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>

// An allocation that cannot be had is null, as it is without the sanitizer.
extern "C" __attribute__((visibility("default"))) const char* __asan_default_options() {
  return "allocator_may_return_null=1";
}

namespace QELO::RequestBody {
namespace {

constexpr std::chrono::milliseconds kLong{60'000};
constexpr PaceLimits kPatient{std::chrono::milliseconds(5000), kLong, 1, kLong};
constexpr PaceLimits kImpatient{std::chrono::milliseconds(30), kLong, 1, kLong};
constexpr PaceLimits kHurried{kLong, std::chrono::milliseconds(50), 1'000'000, kLong};

class RequestBodyTest : public testing::Test {
 protected:
  void SetUp() override { ASSERT_EQ(pipe2(pipe_, O_CLOEXEC), 0); }
  void TearDown() override {
    close(pipe_[0]);
    EndInput();
  }

  void Send(const std::string& text) {
    size_t sent = 0;
    while (sent < text.size()) {
      sent += static_cast<size_t>(write(pipe_[1], text.data() + sent, text.size() - sent));
    }
  }
  void EndInput() {
    if (pipe_[1] >= 0) {
      close(pipe_[1]);
      pipe_[1] = -1;
    }
  }

  int pipe_[2] = {-1, -1};
  std::string text_ = "before";
};

TEST_F(RequestBodyTest, BodyLongerThanAPipeIsReadWhole) {
  const std::string body(1000000, 'x');
  std::thread client([&] { Send(body); });
  EXPECT_TRUE(Read(pipe_[0], 1000000, kPatient, text_));
  client.join();
  EXPECT_EQ(text_, body);
}

TEST_F(RequestBodyTest, ReadingStopsAtTheLengthThoughInputStaysOpen) {
  Send("abcdef");
  EXPECT_TRUE(Read(pipe_[0], 4, kPatient, text_));
  EXPECT_EQ(text_, "abcd");
}

TEST_F(RequestBodyTest, BodyThatEndsEarlyIsTaken) {
  Send("abc");
  EndInput();
  EXPECT_TRUE(Read(pipe_[0], 100, kPatient, text_));
  EXPECT_EQ(text_, "abc");
}

TEST_F(RequestBodyTest, BodyThatStallsIsTakenAfterTheLimit) {
  Send("abc");
  EXPECT_TRUE(Read(pipe_[0], 100, kImpatient, text_));
  EXPECT_EQ(text_, "abc");
}

TEST_F(RequestBodyTest, BodyThatComesTooSlowlyIsTakenAsFarAsItCame) {
  std::atomic<bool> hasEnded = false;
  std::thread client([&] {
    for (int i = 0; i < 1000 && !hasEnded; ++i) {
      Send("x");
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
  });
  EXPECT_TRUE(Read(pipe_[0], 1000, kHurried, text_));
  hasEnded = true;
  client.join();
  EXPECT_LT(text_.size(), 20U);
}

TEST_F(RequestBodyTest, InputThatDoesNotBlockIsWaitedFor) {
  fcntl(pipe_[0], F_SETFL, O_NONBLOCK);
  std::thread client([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    Send("abc");
  });
  EXPECT_TRUE(Read(pipe_[0], 3, kPatient, text_));
  client.join();
  EXPECT_EQ(text_, "abc");
}

TEST_F(RequestBodyTest, DescriptorThatIsClosedFails) {
  close(pipe_[0]);
  EXPECT_FALSE(Read(pipe_[0], 10, kPatient, text_));
  EXPECT_EQ(text_, "before");
  pipe_[0] = -1;
}

TEST_F(RequestBodyTest, LengthBeyondMemoryFails) {
  Send("abc");
  EXPECT_FALSE(Read(pipe_[0], INT64_MAX - 1, kPatient, text_));
  EXPECT_EQ(text_, "before");
}

TEST_F(RequestBodyTest, AnnouncedLengthCostsNoMemory) {
  Send("abc");
  EndInput();
  rusage before{};
  getrusage(RUSAGE_SELF, &before);
  EXPECT_TRUE(Read(pipe_[0], 256L << 20, kPatient, text_));
  rusage after{};
  getrusage(RUSAGE_SELF, &after);
  EXPECT_EQ(text_, "abc");
  EXPECT_LT(after.ru_maxrss - before.ru_maxrss, 64 * 1024);  // KiB
}

TEST_F(RequestBodyTest, StandardInputThatWasClosedBecomesTheNullDevice) {
  const int input = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 10);
  close(STDIN_FILENO);
  CloseStandardInput();
  char byte = 0;
  EXPECT_EQ(read(STDIN_FILENO, &byte, 1), 0);
  EXPECT_EQ(fcntl(STDIN_FILENO, F_GETFD), 0);
  dup2(input, STDIN_FILENO);
  close(input);
}

TEST_F(RequestBodyTest, StandardInputStaysWhenTheNullDeviceCannotBeOpened) {
  Send("rest");
  const pid_t child = fork();
  if (child == 0) {
    dup2(pipe_[0], STDIN_FILENO);
    const int lowest = dup(STDIN_FILENO);
    close(lowest);
    const rlimit full{static_cast<rlim_t>(lowest), static_cast<rlim_t>(lowest)};
    const bool isFull =
        setrlimit(RLIMIT_NOFILE, &full) == 0 && open("/dev/null", O_RDONLY | O_CLOEXEC) < 0;
    CloseStandardInput();
    char text[5] = {};
    const bool isThere = read(STDIN_FILENO, text, 4) == 4 && std::string(text) == "rest";
    _exit((isFull ? 0 : 1) | (isThere ? 0 : 2));
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace QELO::RequestBody
