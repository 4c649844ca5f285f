// Whole files, and what stands in the header.

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <thread>

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

using WholeFile = FileOutput;

TEST_F(WholeFile, IsSentWithItsHeader) {
  const CgiAnswer answer = Send("content");
  EXPECT_EQ(result, 0);
  EXPECT_EQ(answer.Body(), "0123456789");
  EXPECT_EQ(Status(answer), "200");
  EXPECT_EQ(Header(answer, "Content-Type"), "text/plain");
  EXPECT_EQ(Header(answer, "Content-Length"), "10");
  EXPECT_EQ(Header(answer, "Accept-Ranges"), "bytes");
  EXPECT_EQ(Header(answer, "X-Content-Type-Options"), "nosniff");
  EXPECT_EQ(Header(answer, "Cache-Control"), "private, no-cache");
  EXPECT_EQ(Header(answer, "Content-Security-Policy"),
            "default-src 'none'; style-src 'unsafe-inline'; sandbox");
  EXPECT_EQ(Header(answer, "Content-Disposition"), "attachment; filename=\"content\"");
  EXPECT_EQ(Header(answer, "ETag").size(), 18U);
  EXPECT_EQ(Header(answer, "Last-Modified").substr(25), " GMT");
}

TEST_F(WholeFile, OfEachSizeArrives) {
  for (const size_t size : {0, 1, 4095, 4096, 4097, 65535, 65536, 65537, 1000000}) {
    std::string text;
    for (size_t i = 0; text.size() < size; ++i) {
      text += std::to_string(i) + ' ';
    }
    text.resize(size);
    Put("file", text);
    const CgiAnswer answer = Send("file");
    EXPECT_EQ(result, 0);
    EXPECT_EQ(Header(answer, "Content-Length"), std::to_string(size));
    EXPECT_TRUE(answer.Body() == text) << size;
  }
}

TEST_F(WholeFile, HeadersOfTheCallerComeFirstAndCount) {
  const CgiAnswer answer = Send("content", {},
                                {"A: 1", "content-security-policy: sandbox",
                                 "Cache-Control: no-store", "Content-Disposition: inline",
                                 "ETag: \"mine\"", "Last-Modified: Sun, 06 Nov 1994 08:49:37 GMT"});
  EXPECT_EQ(answer.text.substr(0, 6), "A: 1\r\n");
  EXPECT_EQ(Header(answer, "content-security-policy"), "sandbox");
  EXPECT_EQ(Header(answer, "Content-Security-Policy"), "(none)");
  EXPECT_EQ(Header(answer, "Cache-Control"), "no-store");
  EXPECT_EQ(Header(answer, "Content-Disposition"), "inline");
  EXPECT_EQ(Header(answer, "ETag"), "\"mine\"");
  EXPECT_EQ(Header(answer, "Last-Modified"), "Sun, 06 Nov 1994 08:49:37 GMT");
}

TEST_F(WholeFile, HasOneTypeAndOneLengthWhateverTheCallersHeaderSays) {
  const CgiAnswer answer = Send("content", {},
                                {"Content-type: application/json; charset=\"UTF-8\"",
                                 "CONTENT-LENGTH: 5", "X-Content-type-options: x"});
  EXPECT_EQ(answer.text.substr(0, 26), "Content-Type: text/plain\r\n");
  EXPECT_EQ(Header(answer, "Content-Length"), "10");
  EXPECT_EQ(answer.Head().find("application/json"), std::string::npos);
  EXPECT_EQ(answer.Head().find(": 5"), std::string::npos);
  EXPECT_EQ(answer.Head().find(": x"), std::string::npos);
}

TEST_F(WholeFile, LinesCountForOneOutput) {
  EXPECT_TRUE(Send("content", {}, {"A: 1"}).HasLine("A: 1"));
  HTTPFileOutputer outputer;
  outputer.AddHeader("A: 1");
  EXPECT_EQ(outputer.Output(Path("missing"), "t"), HTTPFileOutputer::kNothingSent);
  const CgiAnswer answer = PrintedBy([&] { outputer.Output(Path("content"), "t"); });
  EXPECT_FALSE(answer.HasLine("A: 1"));
}

TEST_F(WholeFile, LaterLineOfANameTakesThePlaceOfTheFormer) {
  const CgiAnswer answer = Send("content", {}, {"X-a: 1", "b: 2", "x-A: 3"});
  EXPECT_EQ(answer.text.substr(0, 14), "x-A: 3\r\nb: 2\r\n");
  EXPECT_FALSE(answer.HasLine("X-a: 1"));
}

TEST_F(WholeFile, HeadRequestHasTheHeaderAlone) {
  const CgiAnswer get = Send("content");
  const CgiAnswer head = Send("content", {{"REQUEST_METHOD", "HEAD"}, {"HTTP_RANGE", "bytes=0-1"}});
  EXPECT_EQ(head.Head(), get.Head());
  EXPECT_EQ(head.Body(), "");
  EXPECT_EQ(result, 0);
}

TEST_F(WholeFile, AnotherStatusOfTheCallersStaysAndAsksForNoConditions) {
  const CgiAnswer answer =
      Send("content", {{"HTTP_RANGE", "bytes=0-1"}, {"HTTP_IF_MATCH", "\"x\""}}, {"Status: 404"});
  EXPECT_EQ(Header(answer, "Status"), "404");
  EXPECT_EQ(answer.Body(), "0123456789");
}

TEST_F(WholeFile, ThatCannotBeReadPrintsNothing) {
  for (const auto& [name, error] :
       std::map<std::string, int>{{"missing", ENOENT}, {"etc", EINVAL}, {"content/x", ENOTDIR}}) {
    const CgiAnswer answer = Send(name);
    EXPECT_EQ(result, HTTPFileOutputer::kNothingSent) << name;
    EXPECT_EQ(errno, error) << name;
    EXPECT_EQ(answer.text, "");
  }
  HTTPFileOutputer outputer;
  EXPECT_EQ(outputer.Output("", "t"), HTTPFileOutputer::kNothingSent);
  EXPECT_EQ(outputer.Output(Path("content") + std::string("\0x", 2), "t"),
            HTTPFileOutputer::kNothingSent);
  EXPECT_EQ(errno, EINVAL);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(WholeFile, PipesAndDevicesAreRefusedAtOnce) {
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
  ASSERT_EQ(symlink("/dev/zero", Path("zero").c_str()), 0);
  for (const char* name : {"pipe", "zero"}) {
    EXPECT_EQ(Send(name).text, "");
    EXPECT_EQ(result, HTTPFileOutputer::kNothingSent) << name;
  }
}

TEST_F(WholeFile, IsReadWithTheRightsOfTheMoment) {
  if (!IsRoot()) {
    GTEST_SKIP() << "root alone becomes somebody else";
  }
  Write("secret", "s", 0600);
  EXPECT_EQ(InChild([this] {
              return setresuid(1002, 1002, 1002) == 0 && Send("secret").text.empty() &&
                             result == HTTPFileOutputer::kNothingSent && errno == EACCES
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(WholeFile, LinksAreFollowed) {
  ASSERT_EQ(symlink("content", Path("link").c_str()), 0);
  EXPECT_EQ(Send("link").Body(), "0123456789");
}

TEST_F(WholeFile, OpenDescriptorIsSentByItsPath) {
  const int file = open(Path("content").c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(unlink(Path("content").c_str()), 0);
  const CgiAnswer answer = PrintedBy(
      [&] { result = HTTPFileOutputer().Output("/proc/self/fd/" + std::to_string(file), "t"); });
  close(file);
  EXPECT_EQ(result, 0);
  EXPECT_EQ(answer.Body(), "0123456789");
  EXPECT_EQ(Header(answer, "Content-Disposition"), "attachment");  // its number is no name
}

TEST_F(WholeFile, ComesBehindWhatWasPrintedBefore) {
  const CgiAnswer answer = PrintedBy([&] {
    printf("X-Before: 1\r\n");
    HTTPFileOutputer().Output(Path("content"), "t");
  });
  EXPECT_EQ(answer.text.substr(0, 13), "X-Before: 1\r\n");
  EXPECT_EQ(answer.Body(), "0123456789");
}

TEST_F(WholeFile, GoesToAnOutputThatSendfileDoesNotKnow) {
  Put("out", "");
  const int out = open(Path("out").c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
  {
    const Redirection output(STDOUT_FILENO, out);
    result = HTTPFileOutputer().Output(Path("content"), "t");
  }
  close(out);
  EXPECT_EQ(result, 0);
  EXPECT_NE(Read("out").find("\r\n\r\n0123456789"), std::string::npos);
}

/// What one end of a socket pair that does not wait gets while the other is standard output.
TEST_F(WholeFile, WaitsForAnOutputThatHasNoRoom) {
  Put("file", std::string(4 << 20, 'x'));
  int ends[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0, ends), 0);
  fcntl(ends[1], F_SETFL, 0);
  size_t received = 0;
  std::thread reader([&] {
    char chunk[65536];
    for (ssize_t count = 0; (count = read(ends[1], chunk, sizeof chunk)) > 0;) {
      received += static_cast<size_t>(count);
    }
  });
  {
    const Redirection output(STDOUT_FILENO, ends[0]);
    result = HTTPFileOutputer().Output(Path("file"), "t");
  }
  close(ends[0]);
  reader.join();
  close(ends[1]);
  EXPECT_EQ(result, 0);
  EXPECT_GT(received, 4U << 20U);
}

TEST_F(WholeFile, TypeThatWouldBecomeAnotherHeaderIsNotSent) {
  for (const std::string& type : {std::string("a/b\r\nSet-Cookie: c=d"), std::string("a/b\nX: y"),
                                  std::string("a/b\0c", 5), std::string()}) {
    const CgiAnswer answer =
        PrintedBy([&] { result = HTTPFileOutputer().Output(Path("content"), type); });
    EXPECT_EQ(Header(answer, "Content-Type"), "application/octet-stream");
    EXPECT_EQ(Header(answer, "Set-Cookie"), "(none)");
    EXPECT_EQ(Header(answer, "X"), "(none)");
  }
}

TEST_F(WholeFile, ClientThatIsGoneEndsTheOutputAndNothingElse) {
  Put("file", std::string(1 << 20, 'x'));
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  close(ends[0]);
  {
    const Redirection output(STDOUT_FILENO, ends[1]);
    result = HTTPFileOutputer().Output(Path("file"), "t");
  }
  close(ends[1]);
  EXPECT_EQ(result, HTTPFileOutputer::kBrokenOff);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
  EXPECT_EQ(signal(SIGPIPE, SIG_DFL), SIG_DFL);
}

TEST_F(WholeFile, OutputThatFailsOtherwiseIsLogged) {
  const int full = open("/dev/full", O_WRONLY | O_CLOEXEC);
  {
    const Redirection output(STDOUT_FILENO, full);
    result = HTTPFileOutputer().Output(Path("content"), "t");
  }
  close(full);
  EXPECT_EQ(result, HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count("the answer broke off ["), 1);
}

TEST_F(WholeFile, ThatBecomesShorterWhileItIsSentIsBrokenOff) {
  Put("file", std::string(1 << 20, 'x'));
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  std::thread reader([&] {
    char chunk[4096];
    ssize_t count = read(ends[0], chunk, sizeof chunk);  // it has been opened and has a length
    truncate(Path("file").c_str(), 0);
    while (count > 0) {
      count = read(ends[0], chunk, sizeof chunk);
    }
  });
  {
    const Redirection output(STDOUT_FILENO, ends[1]);
    result = HTTPFileOutputer().Output(Path("file"), "t");
  }
  close(ends[1]);
  reader.join();
  close(ends[0]);
  EXPECT_EQ(result, HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count("the answer broke off: the file or stream has become shorter"), 1);
}

}  // namespace
}  // namespace QELO
