#include "webapi/Pipe.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdint>
#include <fstream>
#include <string>

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
    ASSERT_TRUE(pipe.Init());
  }

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
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the sanitizer needs the address space that this test takes away";
#endif
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
    EXPECT_EQ(value, Json::Value(sent ? std::string(size - 2, 'x') : "no room"));
    EXPECT_EQ(waitForEnd(child), 0);
  });
  EXPECT_EQ(status, 0) << size << " bytes";
}

TEST(PipeRoom, PrivilegedWriterSendsFourMebibytes) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  for (const size_t size : {65536u, 1u << 20, 4u << 20, (16u << 20) - 4096}) {
    expectSending(size, false, true);
  }
}

TEST(PipeRoom, OrdinaryWriterSendsUpToTheSystemsLimit) {
  const size_t page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
  const size_t limit = static_cast<size_t>(systemLimit());
  for (const size_t size : {page, size_t{65536}, size_t{200000}, limit - page}) {
    expectSending(size, true, true);
  }
}

TEST(PipeRoom, OrdinaryWriterBeyondTheSystemsLimitFailsAndMaySendLess) {
  const size_t page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
  const size_t limit = static_cast<size_t>(systemLimit());
  for (const size_t size : {limit - page + 1, 4 * limit}) {
    expectSending(size, true, false);
  }
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
