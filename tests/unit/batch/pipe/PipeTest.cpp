#include "webapi/Pipe.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/Sanitizer.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/batch/ChildProcess.h"
#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

constexpr int kWriteEnd = 700;  ///< where the tests put the second holder of a write end

Json::Value parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
  return value;
}

std::string lengthBytes(uint32_t length) {
  return std::string(reinterpret_cast<const char*>(&length), sizeof length);
}

long systemLimit() {
  long limit = 0;
  std::ifstream("/proc/sys/fs/pipe-max-size") >> limit;
  return limit;
}

class PipeMessage : public testing::Test {
 protected:
  void SetUp() override {
    SyslogCapture::Clear();
    const std::set<int> before = openDescriptors();
    ASSERT_TRUE(pipe.Init());
    const std::set<int> after = openDescriptors();
    std::set_difference(after.begin(), after.end(), before.begin(), before.end(),
                        std::back_inserter(ends_));
    ASSERT_EQ(ends_.size(), 2u);
  }

  /// The descriptors of the pipe that SetUp() opened: the read end is opened first.
  int ReadEnd() const { return ends_[0]; }
  int WriteEnd() const { return ends_[1]; }

  /// The child writes these bytes and ends; the parent reads one value.
  bool ReadAfter(const std::string& bytes, Json::Value& value) {
    const pid_t child = fork();
    if (child == 0) {
      pipe.WriteOnly(kWriteEnd);
      const ssize_t count = write(kWriteEnd, bytes.data(), bytes.size());
      _exit(count == static_cast<ssize_t>(bytes.size()) ? 0 : 1);
    }
    pipe.ReadOnly(-1);
    const bool read = pipe.ReadJson(value);
    waitForEnd(child);
    return read;
  }

  Pipe pipe;

 private:
  std::vector<int> ends_;
};

TEST_F(PipeMessage, IsItsLengthAndItsText) {
  const pid_t child = fork();
  if (child == 0) {
    pipe.WriteOnly(-1);
    _exit(pipe.WriteJson(parse(R"({"a":1})")) ? 0 : 1);
  }
  EXPECT_EQ(waitForEnd(child), 0);
  pipe.ReadOnly(-1);
  char buffer[64];
  EXPECT_EQ(pipe.Read(buffer, 4), 4);
  EXPECT_EQ(std::string(buffer, 4), lengthBytes(7));
  EXPECT_EQ(pipe.Read(buffer, sizeof buffer), 7);
  EXPECT_EQ(std::string(buffer, 7), R"({"a":1})");
  EXPECT_EQ(pipe.Read(buffer, sizeof buffer), 0);
}

TEST_F(PipeMessage, ArrivesAsItWasSent) {
  for (const char* text :
       {"null", "false", "\"\"", "5", "[]", R"({"a":[1,{"b":"\u0000\u00e4\n"}]})"}) {
    Pipe tested;
    ASSERT_TRUE(tested.Init());
    const pid_t child = fork();
    if (child == 0) {
      tested.WriteOnly(-1);
      _exit(tested.WriteJson(parse(text)) ? 0 : 1);
    }
    tested.ReadOnly(-1);
    Json::Value value;
    EXPECT_TRUE(tested.ReadJson(value)) << text;
    EXPECT_EQ(value, parse(text));
    EXPECT_EQ(waitForEnd(child), 0);
  }
}

TEST_F(PipeMessage, WriterThatEndedWithoutWritingIsLogged) {
  Json::Value value = "as it was";
  EXPECT_FALSE(ReadAfter("", value));
  EXPECT_EQ(value, Json::Value("as it was"));
  EXPECT_EQ(SyslogCapture::Count("APIUtilsPrivate.cpp:"), 1);
  EXPECT_EQ(SyslogCapture::Count("protocol failed"), 1);
  EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
}

TEST_F(PipeMessage, PartOfALengthIsLogged) {
  Json::Value value;
  EXPECT_FALSE(ReadAfter("abc", value));
  EXPECT_EQ(SyslogCapture::Count("protocol failed"), 1);
}

TEST_F(PipeMessage, LengthZeroIsLogged) {
  Json::Value value;
  EXPECT_FALSE(ReadAfter(lengthBytes(0), value));
  EXPECT_EQ(SyslogCapture::Count("APIUtilsPrivate.cpp:"), 1);
  EXPECT_EQ(SyslogCapture::Count("error size=0"), 1);
}

TEST_F(PipeMessage, TextCutShortIsLogged) {
  Json::Value value;
  EXPECT_FALSE(ReadAfter(lengthBytes(10) + "{\"a\"", value));
  EXPECT_EQ(SyslogCapture::Count("read json 10 failed, got 4"), 1);
}

TEST_F(PipeMessage, MissingTextIsLogged) {
  Json::Value value;
  EXPECT_FALSE(ReadAfter(lengthBytes(10), value));
  EXPECT_EQ(SyslogCapture::Count("read json 10 failed, got 0"), 1);
}

TEST_F(PipeMessage, TextThatIsNoJsonIsRefused) {
  Json::Value value;
  EXPECT_FALSE(ReadAfter(lengthBytes(7) + "rubbish", value));
}

TEST_F(PipeMessage, LengthBeyondMemoryIsLogged) {
  if (IsSanitized()) {
    GTEST_SKIP() << "the sanitizer needs the address space that this test takes away";
  }
  const int status = inChild([&] {
    const rlimit limit{1UL << 30, 1UL << 30};
    ASSERT_EQ(setrlimit(RLIMIT_AS, &limit), 0);
    Json::Value value;
    EXPECT_FALSE(ReadAfter(lengthBytes(0xFFFFFFFF) + "{}", value));
    EXPECT_EQ(SyslogCapture::Count("new szBuf[4294967295] failed"), 1);
  });
  EXPECT_EQ(status, 0);
}

TEST_F(PipeMessage, ReaderOfNoPipeIsLogged) {
  Pipe closed;
  Json::Value value;
  EXPECT_FALSE(closed.ReadJson(value));
  EXPECT_EQ(SyslogCapture::Count("protocol failed"), 1);
}

TEST_F(PipeMessage, WriterWithoutAReaderFailsAndLivesOn) {
  pipe.WriteOnly(-1);
  void (*former)(int) = signal(SIGPIPE, SIG_DFL);
  EXPECT_FALSE(pipe.WriteJson(parse(R"({"a":1})")));
  EXPECT_EQ(signal(SIGPIPE, former), SIG_DFL);
  EXPECT_FALSE(Pipe().WriteJson(1));
}

TEST_F(PipeMessage, NestedAsDeepAsTextsMayBeArrives) {
  const std::string text =
      std::string(JsonHelper::kMaxDepth, '[') + std::string(JsonHelper::kMaxDepth, ']');
  EXPECT_TRUE(pipe.WriteJson(parse(text)));
  Json::Value value;
  EXPECT_TRUE(pipe.ReadJson(value));
  EXPECT_EQ(value, parse(text));
}

TEST_F(PipeMessage, NestedDeeperIsLoggedAndNotBegun) {
  for (const bool list : {true, false}) {
    Json::Value value;
    for (int level = 0; level <= JsonHelper::kMaxDepth; ++level) {
      Json::Value outer;
      (list ? outer[0] : outer["a"]) = value;
      value.swap(outer);
    }
    SyslogCapture::Clear();
    EXPECT_FALSE(pipe.WriteJson(value));
    EXPECT_FALSE(pipe.HasWritten());
    ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, LOG_ERR);
    EXPECT_EQ(SyslogCapture::Count("APIUtilsPrivate.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("json nests deeper than 256"), 1);
  }
  EXPECT_TRUE(pipe.WriteJson("another"));
  Json::Value value;
  EXPECT_TRUE(pipe.ReadJson(value));
  EXPECT_EQ(value, Json::Value("another"));
}

TEST_F(PipeMessage, TextThatCannotBeWrittenBehindItsLengthFails) {
  // In the place of the pipe a file that takes the length and no byte of the text, or a part.
  for (const rlim_t room : {4u, 6u}) {
    const int status = inChild([&] {
      const int file = memfd_create("pipe", MFD_CLOEXEC);
      ASSERT_EQ(dup2(file, WriteEnd()), WriteEnd());
      signal(SIGXFSZ, SIG_IGN);
      const rlimit limit{room, room};
      ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limit), 0);
      EXPECT_FALSE(pipe.HasWritten());
      EXPECT_FALSE(pipe.WriteJson(parse(R"({"a":1})")));
      EXPECT_TRUE(pipe.HasWritten());
      char bytes[8] = {};
      EXPECT_EQ(pread(file, bytes, sizeof bytes, 0), static_cast<ssize_t>(room));
      EXPECT_EQ(std::string(bytes, 4), lengthBytes(7));
    });
    EXPECT_EQ(status, 0) << room;
  }
}

TEST_F(PipeMessage, TextThatCannotBeReadIsLogged) {
  ASSERT_EQ(write(WriteEnd(), lengthBytes(10).data(), 4), 4);
  ASSERT_EQ(fcntl(ReadEnd(), F_SETFL, O_NONBLOCK), 0);
  Json::Value value = "as it was";
  EXPECT_FALSE(pipe.ReadJson(value));
  EXPECT_EQ(value, Json::Value("as it was"));
  EXPECT_EQ(SyslogCapture::Count("read json 10 failed, got 18446744073709551615"), 1);
}

TEST_F(PipeMessage, SignalWhileWaitingChangesNothing) {
  struct sigaction caught {};
  struct sigaction former {};
  caught.sa_handler = [](int) {};  // and no SA_RESTART
  ASSERT_EQ(sigaction(SIGUSR1, &caught, &former), 0);
  const pid_t parent = getpid();
  const pid_t child = fork();
  if (child == 0) {
    pipe.WriteOnly(kWriteEnd);
    const std::string bytes = lengthBytes(7) + R"({"a":1})";
    for (const auto& [from, count] : {std::pair<size_t, size_t>{0, 4}, {4, 7}}) {
      usleep(100000);
      kill(parent, SIGUSR1);
      usleep(100000);
      [[maybe_unused]] const ssize_t written = write(kWriteEnd, bytes.data() + from, count);
    }
    _exit(0);
  }
  pipe.ReadOnly(-1);
  Json::Value value;
  EXPECT_TRUE(pipe.ReadJson(value));
  EXPECT_EQ(value, parse(R"({"a":1})"));
  sigaction(SIGUSR1, &former, nullptr);
  EXPECT_EQ(waitForEnd(child), 0);
}

TEST_F(PipeMessage, EveryRefusalIsAnErrorOfTheSameSource) {
  Json::Value value;
  for (const std::string& bytes : {std::string(), lengthBytes(0), lengthBytes(10)}) {
    ASSERT_TRUE(pipe.Init());
    EXPECT_FALSE(ReadAfter(bytes, value));
  }
  ASSERT_EQ(SyslogCapture::Messages().size(), 3u);
  for (const SyslogCapture::Message& message : SyslogCapture::Messages()) {
    EXPECT_EQ(message.priority, LOG_ERR);
    EXPECT_TRUE(std::regex_match(
        message.text, std::regex("APIUtilsPrivate\\.cpp:[1-9][0-9]* "
                                 "(protocol failed|error size=0|read json 10 failed, got 0)")))
        << message.text;
  }
}

/// Sends a text of that many bytes from child to parent, both of root or of an ordinary user.
/// @param sent  whether it arrives; else a short one must
void expectSending(size_t size, bool ordinary, bool sent) {
  const int status = inChild([=] {
    if (ordinary) {
      ASSERT_TRUE(becomeOrdinary());
    }
    Pipe pipe;
    ASSERT_TRUE(pipe.Init());
    const pid_t child = fork();
    if (child == 0) {
      pipe.WriteOnly(-1);
      // The quotes are the text's as well.
      const bool written = pipe.WriteJson(std::string(size - 2, 'x'));
      _exit(written == sent && (written || pipe.WriteJson("no room")) ? 0 : 1);
    }
    pipe.ReadOnly(-1);
    Json::Value value;
    EXPECT_TRUE(pipe.ReadJson(value));
    EXPECT_TRUE(value == Json::Value(sent ? std::string(size - 2, 'x') : "no room"));
    EXPECT_EQ(waitForEnd(child), 0);
  });
  EXPECT_EQ(status, 0) << size << " bytes";
}

TEST(PipeRoom, PrivilegedWriterSendsFourMebibytes) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  for (const size_t size : {65536u, 1u << 20, 4u << 20, (16u << 20) - 4}) {
    expectSending(size, false, true);
  }
}

TEST(PipeRoom, OrdinaryWriterSendsUpToTheSystemsLimit) {
  const size_t page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
  const size_t limit = static_cast<size_t>(systemLimit());
  for (const size_t size : {page, size_t{65536}, size_t{200000}, limit - page, limit - 4}) {
    expectSending(size, true, true);
  }
}

TEST(PipeRoom, OrdinaryWriterBeyondTheSystemsLimitFailsAndMaySendLess) {
  const size_t limit = static_cast<size_t>(systemLimit());
  for (const size_t size : {limit - 3, limit, 4 * limit}) {
    expectSending(size, true, false);
  }
}

TEST(PipeRoom, SmallPipeThatCannotGrowIsFilledToItsEnd) {
  const int status = inChild([] {
    ASSERT_TRUE(becomeOrdinary());
    // Takes all the pages that the system gives a user.
    for (int ends[2]; pipe(ends) == 0 && fcntl(ends[0], F_SETPIPE_SZ, systemLimit()) > 0;) {
    }
    const size_t room = 2 * static_cast<size_t>(sysconf(_SC_PAGESIZE));
    for (const size_t size : {room / 2 - 4, room / 2 + 1, room - 4, room - 3, room}) {
      const std::set<int> before = openDescriptors();
      Pipe tested;
      ASSERT_TRUE(tested.Init());
      std::set<int> opened;
      for (const int fd : openDescriptors()) {
        if (before.count(fd) == 0 && fcntl(fd, F_GETPIPE_SZ) > 0) {
          opened.insert(fd);
        }
      }
      ASSERT_EQ(opened.size(), 2u);
      if (fcntl(*opened.begin(), F_GETPIPE_SZ) != static_cast<int>(room)) {
        GTEST_SKIP() << "the system does not limit a user's pipes to two pages";
      }
      const bool fits = size + 4 <= room;
      const bool written = tested.WriteJson(std::string(size - 2, 'x'));
      EXPECT_EQ(written, fits) << size;
      EXPECT_EQ(tested.HasWritten(), fits) << size;
      if (written) {
        Json::Value value;
        EXPECT_TRUE(tested.ReadJson(value)) << size;
        EXPECT_EQ(value.asString().size(), size - 2) << size;
      }
    }
  });
  EXPECT_EQ(status, 0);
}

TEST(PipeRoom, WriterThatGaveUpRootKeepsTheRoomOfRoot) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  Pipe pipe;
  ASSERT_TRUE(pipe.Init());
  const pid_t child = fork();
  if (child == 0) {
    pipe.WriteOnly(-1);
    _exit(becomeOrdinary() && pipe.WriteJson(std::string(4 << 20, 'x')) ? 0 : 1);
  }
  pipe.ReadOnly(-1);
  Json::Value value;
  EXPECT_TRUE(pipe.ReadJson(value));
  EXPECT_EQ(value.asString().size(), 4u << 20);
  EXPECT_EQ(waitForEnd(child), 0);
}

}  // namespace
}  // namespace QELO
