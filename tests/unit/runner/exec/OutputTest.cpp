// What a method of a call from code prints.

#include <fcntl.h>
#include <sys/mman.h>

#include <cstdio>
#include <iostream>

#include "tests/unit/runner/exec/Fixture.h"

namespace QELO {
namespace {

class ExecOutput : public ExecTest {
 protected:
  void SetUp() override {
    ExecTest::SetUp();
    output_ = memfd_create("output", MFD_CLOEXEC);
  }
  void TearDown() override {
    close(output_);
    ExecTest::TearDown();
  }

  /// Calls a method of "downloads". @return what reached the descriptor
  std::string Printed(const std::string& method, const Json::Value& params = Json::Value()) {
    const ExecParam param = Call(method, 1, "{}", kDownload).SetParams(params).SetOutputFd(output_);
    result = APIRunner::Exec(param);
    return Text();
  }

  /// What reached the descriptor, which is empty afterwards.
  std::string Text() const {
    std::string text(static_cast<size_t>(lseek(output_, 0, SEEK_END)), '\0');
    EXPECT_EQ(pread(output_, text.data(), text.size(), 0), static_cast<ssize_t>(text.size()));
    EXPECT_EQ(ftruncate(output_, 0), 0);
    lseek(output_, 0, SEEK_SET);
    return text;
  }

  Json::Value result;
  int output_ = -1;
};

TEST_F(ExecOutput, OnlyTheBodyArrives) {
  for (const char* way : {"stream", "file", "descriptor"}) {
    Json::Value params;
    params["way"] = way;
    params["body"] = "first\r\n\r\nsecond";
    EXPECT_EQ(Printed("print", params), "first\r\n\r\nsecond") << way;
    EXPECT_EQ(result, Parse(R"({"success": true, "data": "printed", "httpd_restart": false})"));
  }
}

TEST_F(ExecOutput, EmptyBodyIsNothing) {
  EXPECT_EQ(Printed("print"), "");
  EXPECT_EQ(result["data"], Json::Value("printed"));
}

TEST_F(ExecOutput, LongBodyArrivesByteForByte) {
  Json::Value params;
  params["size"] = 3000000;
  const std::string text = Printed("bytes", params);
  ASSERT_EQ(text.size(), 3000000u);
  bool same = true;
  for (size_t i = 0; i < text.size(); ++i) {
    same = same && text[i] == static_cast<char>(i % 256);
  }
  EXPECT_TRUE(same);
}

TEST_F(ExecOutput, WithoutAnEmptyLineNothingArrivesButTheResult) {
  Json::Value params;
  params["text"] = "X-Number: 1\r\nno end of the head\n\n" + std::string(10000, 'x');
  EXPECT_EQ(Printed("bare", params), "");
  EXPECT_EQ(result["data"], Json::Value("printed"));
}

TEST_F(ExecOutput, HeadWhoseEndIsSplitDropsAll) {
  EXPECT_EQ(Printed("split"), "");
  EXPECT_EQ(result["data"], Json::Value("printed"));
}

TEST_F(ExecOutput, HeadLongerThanAReadEndsInALaterOne) {
  Json::Value params;
  params["text"] = "X-Long: " + std::string(4990, 'h') + "\r\n\r\nbody";
  EXPECT_EQ(Printed("bare", params), "body");
  params["text"] = "X-Long: " + std::string(10000, 'h') + "\r\n\r\n" + std::string(9000, 'b');
  EXPECT_EQ(Printed("bare", params), std::string(9000, 'b'));
}

TEST_F(ExecOutput, HeadWhoseEndStraddlesTheEndOfAReadDropsAll) {
  // A read takes 4095 bytes.
  for (const size_t length : {4092u, 4093u, 4094u}) {
    Json::Value params;
    params["text"] = std::string(length, 'h') + "\r\n\r\nbody";
    EXPECT_EQ(Printed("bare", params), "") << length;
    EXPECT_EQ(result["data"], Json::Value("printed"));
  }
  for (const size_t length : {4091u, 4095u}) {
    Json::Value params;
    params["text"] = std::string(length, 'h') + "\r\n\r\nbody";
    EXPECT_EQ(Printed("bare", params), "body") << length;
  }
}

TEST_F(ExecOutput, HeadWhoseEndIsSplitEndsAtTheNextEmptyLineOfTheBody) {
  Json::Value params;
  params["text"] = std::string(4093, 'h') + "\r\n\r\nfirst\r\n\r\nsecond\r\n\r\nthird";
  EXPECT_EQ(Printed("bare", params), "second\r\n\r\nthird");
}

TEST_F(ExecOutput, DescriptorMayBeZero) {
  const int former = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
  const int file = memfd_create("zero", MFD_CLOEXEC);
  ASSERT_EQ(dup2(file, STDIN_FILENO), STDIN_FILENO);
  ExecParam print = Call("print", 1, R"({"body": "at zero"})", kDownload);
  EXPECT_EQ(APIRunner::Exec(print.SetOutputFd(0))["data"], Json::Value("printed"));
  EXPECT_NE(APIRunner::Exec(Call("process", 2).SetOutputFd(0))["data"]["pid"].asInt(), getpid());
  EXPECT_EQ(Forks(), 2);
  dup2(former, STDIN_FILENO);
  close(former);
  char text[64] = {};
  EXPECT_EQ(pread(file, text, sizeof text, 0), 7);
  EXPECT_EQ(std::string(text), "at zero");
  close(file);
}

TEST_F(ExecOutput, MethodThatMayNotDownloadPrintsNothing) {
  Describe(kDownload, "downloads", {"print"});
  Json::Value params;
  params["body"] = "x";
  EXPECT_EQ(Printed("print", params), "");
  EXPECT_EQ(result["data"], Json::Value("printed"));
}

TEST_F(ExecOutput, LibraryThatPrintsWhenItIsClosedPrintsNothing) {
  Describe("QELO.Test.Call", "printing", {"run"}, R"({"grantable": true})");
  fflush(stdout);
  std::cout.flush();
  const int former = dup(STDOUT_FILENO);
  dup2(output_, STDOUT_FILENO);
  printf("before ");
  result = APIRunner::Exec(Call("run", 1, "{}", "QELO.Test.Call"));
  printf("after");
  fflush(stdout);
  dup2(former, STDOUT_FILENO);
  close(former);
  EXPECT_EQ(result["data"], Json::Value("printed"));
  EXPECT_EQ(Text(), "before after");
}

TEST_F(ExecOutput, LostChildLeavesWhatItPrinted) {
  EXPECT_EQ(Printed("broken"), "half");
  EXPECT_EQ(result, Failure(117));
}

TEST_F(ExecOutput, DescriptorThatCannotBeWrittenIsLoggedAndTheResultArrives) {
  const int readOnly = open("/dev/null", O_RDONLY | O_CLOEXEC);
  Json::Value params;
  params["size"] = 1000000;
  const ExecParam param = Call("bytes", 1, "{}", kDownload).SetParams(params).SetOutputFd(readOnly);
  EXPECT_EQ(APIRunner::Exec(param)["data"], Json::Value("printed"));
  EXPECT_EQ(SyslogCapture::Count("write output failed ["), 1);
  close(readOnly);
}

TEST_F(ExecOutput, SlowReaderThatDoesNotBlockGetsAll) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
  const pid_t reader = fork();
  if (reader == 0) {
    close(ends[1]);
    fcntl(ends[0], F_SETFL, 0);
    size_t total = 0;
    char buffer[4096];
    for (ssize_t count; (count = read(ends[0], buffer, sizeof buffer)) > 0;) {
      total += static_cast<size_t>(count);
      usleep(200);
    }
    _exit(total == 1000000 ? 0 : 1);
  }
  Json::Value params;
  params["size"] = 1000000;
  APIRunner::Exec(Call("bytes", 1, "{}", kDownload).SetParams(params).SetOutputFd(ends[1]));
  close(ends[0]);
  close(ends[1]);
  int status = -1;
  waitpid(reader, &status, 0);
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace QELO
