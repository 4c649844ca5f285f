// Header lines and body on standard output.

#include <dlfcn.h>

#include "tests/support/CgiFixture.h"
#include "webapi/base/BrokenPipe.h"
#include "webapi/model/response/HeaderLines.h"

namespace {
FILE* purged = nullptr;  ///< the last stream that was
}  // namespace

// Takes the place of the C library's for the whole test program, and calls it. The C library may
// have emptied the buffer when the writing failed, so its content alone does not show the call.
extern "C" __attribute__((visibility("default"))) void __fpurge(FILE* stream) noexcept {
  purged = stream;
  reinterpret_cast<void (*)(FILE*)>(dlsym(RTLD_NEXT, "__fpurge"))(stream);
}

namespace QELO {
namespace {

using Lines = std::vector<std::string>;

constexpr char kSource[] = "WebEntry.cpp";

constexpr char kFixed[] =
    "X-Content-Type-Options: nosniff\r\n"
    "X-XSS-Protection: 1; mode=block\r\n"
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
    "Pragma: no-cache\r\n"
    "Expires: 0\r\n"
    "\r\n";

class Output : public CgiTest {
 protected:
  Json::Value& Headers() { return entry_.Response()->Serialize()["headers"]; }
  Json::Value& Cookies() { return entry_.Response()->Serialize()["setCookie"]; }
  std::string PrintedHeader() {
    return Printed([this] { entry_.OutputHeader(); }).text;
  }
  std::string PrintedBody() {
    return Printed([this] { entry_.OutputBody(); }).text;
  }

  TestEntry entry_;
};

TEST_F(Output, NoHeadersAndCookiesStillYieldTheFixedLines) {
  Headers().clear();
  EXPECT_EQ(PrintedHeader(), kFixed);
}

TEST_F(Output, HeadersComeBeforeCookiesBeforeTheFixedLines) {
  entry_.Response()->SetHeader("X-B", "2");
  entry_.Response()->SetHeader("A", "1");
  entry_.Response()->AddCookie("c", "v");
  entry_.Response()->AddCookie("c", "w");
  EXPECT_EQ(PrintedHeader(), std::string("A: 1\r\n"
                                         "Content-type: application/json; charset=\"UTF-8\"\r\n"
                                         "X-B: 2\r\n"
                                         "Set-Cookie: c=v; path=/\r\n"
                                         "Set-Cookie: c=w; path=/\r\n") +
                                 kFixed);
}

TEST_F(Output, StatusIsAHeaderAmongOthers) {
  Headers().clear();
  entry_.Response()->SetStatus(HTTP_STATUS_NOT_FOUND);
  EXPECT_EQ(PrintedHeader(), std::string("Status: 404\r\n") + kFixed);
}

TEST_F(Output, HeaderThatIsNoTextIsSkipped) {
  Headers()["X-Number"] = 5;
  Headers()["X-Null"] = Json::Value();
  Headers()["X-Text"] = "t";
  Headers().removeMember("Content-type");
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{"X-Text: t"});
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(Output, CookieThatIsNoTextIsSkipped) {
  Cookies().append("a=1");
  Cookies().append(5);
  Cookies().append("b=2");
  EXPECT_EQ(CookieLines(*entry_.Response()), (Lines{"Set-Cookie: a=1", "Set-Cookie: b=2"}));
}

TEST_F(Output, HeadersAndCookiesThatAreNoContainersYieldNone) {
  Headers() = Json::Value(5);
  Cookies() = Json::Value("a=1");
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{});
  EXPECT_EQ(CookieLines(*entry_.Response()), Lines{});
}

TEST_F(Output, HeaderValueWithALineEndOrNulIsNotSent) {
  Headers().clear();
  entry_.Response()->SetHeader("X-Cr", "a\rb");
  entry_.Response()->SetHeader("X-Lf", "a\nSet-Cookie: id=1");
  entry_.Response()->SetHeader("X-Nul", std::string("a\0b", 3));
  entry_.Response()->SetHeader("X-Tab", "a\tb");
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{"X-Tab: a\tb"});
  EXPECT_EQ(SyslogCapture::Count("header X-Cr is not sent"), 1);
  EXPECT_EQ(SyslogCapture::Count("header X-Lf is not sent"), 1);
  EXPECT_EQ(SyslogCapture::Count("header X-Nul is not sent"), 1);
}

TEST_F(Output, HeaderNameThatIsNoTokenIsNotSent) {
  Headers().clear();
  for (const char* name : {"a b", "a:b", "a\nb", "a\rb", "\xC3\xA9", "(a)", "a\tb"}) {
    Headers()[name] = "v";
  }
  Headers()[std::string("a\0b", 3)] = "v";
  Headers()[""] = "v";
  Headers()["a-Z0!#$%&'*+.^_`|~"] = "v";
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{"a-Z0!#$%&'*+.^_`|~: v"});
  EXPECT_EQ(SyslogCapture::Count("is not sent"), 9);
  EXPECT_EQ(SyslogCapture::Count("header a?b is not sent"), 4);  // no line end reaches the log
}

TEST_F(Output, CookieWithALineEndOrNulIsNotSent) {
  Cookies().append("a=1\r\nX: y");
  Cookies().append("b=1\nX: y");
  Cookies().append(std::string("c=1\0", 4));
  Cookies().append("d=1");
  EXPECT_EQ(CookieLines(*entry_.Response()), Lines{"Set-Cookie: d=1"});
  EXPECT_EQ(SyslogCapture::Count("cookie a is not sent"), 1);
  EXPECT_EQ(SyslogCapture::Count("cookie b is not sent"), 1);
  EXPECT_EQ(SyslogCapture::Count("cookie c is not sent"), 1);
}

TEST_F(Output, AnotherSpellingOfContentTypeWinsOverThePreset) {
  for (const char* name : {"Content-Type", "content-type", "content-Type"}) {
    TestEntry entry;
    entry.Response()->SetHeader(name, "text/html");
    EXPECT_EQ(HeaderLines(*entry.Response(), kSource), Lines{std::string(name) + ": text/html"});
  }
}

TEST_F(Output, PresetContentTypeThatAMethodReplacedStays) {
  entry_.Response()->SetHeader("Content-type", "text/html");
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{"Content-type: text/html"});
}

TEST_F(Output, TwoOtherSpellingsOfContentTypeGiveOneLine) {
  entry_.Response()->SetHeader("Content-Type", "text/html");
  entry_.Response()->SetHeader("content-type", "text/css");
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource), Lines{"Content-Type: text/html"});
}

TEST_F(Output, OtherSpellingThatCannotBeSentLeavesThePreset) {
  Headers()["content-type"] = "text/html\r\nX: y";
  Headers()["Content-Type"] = 5;
  EXPECT_EQ(HeaderLines(*entry_.Response(), kSource),
            Lines{"Content-type: application/json; charset=\"UTF-8\""});
}

TEST_F(Output, BodyIsTheAnswersTextAlone) {
  entry_.Response()->SetSuccess(Parse(R"({"a": [1, "\u00e9"]})"));
  EXPECT_EQ(PrintedBody(), "{\"data\":{\"a\":[1,\"\xC3\xA9\"]},\"success\":true}");
}

TEST_F(Output, BodyOfAnAnswerThatWasNeverSetIsAnEmptyObject) {
  EXPECT_EQ(PrintedBody(), "{}");
}

TEST_F(Output, BodyWithBytesThatAreNoUtf8IsStillJson) {
  entry_.Response()->SetSuccess(Json::Value("caf\xE9.txt"));
  EXPECT_EQ(PrintedBody(), "{\"data\":\"caf\xEF\xBF\xBD.txt\",\"success\":true}");
  EXPECT_EQ(entry_.Response()->GetBody()["data"], "caf\xE9.txt");
}

TEST_F(Output, BodyIsFlushed) {
  entry_.Response()->SetSuccess();
  const int fd = memfd_create("output", MFD_CLOEXEC);
  {
    fflush(stdout);
    const Redirection output(STDOUT_FILENO, fd);
    entry_.OutputBody();
    EXPECT_EQ(lseek(fd, 0, SEEK_END), 16);
  }
  close(fd);
}

TEST_F(Output, WhatAMethodPrintedAndCannotBeWrittenIsPurgedSoThatNoLaterFlushSendsIt) {
  entry_.Response()->SetSuccess(Json::Value("lost"));
  const int full = open("/dev/full", O_WRONLY | O_CLOEXEC);
  const int later = memfd_create("later", MFD_CLOEXEC);
  fflush(stdout);
  purged = nullptr;
  {
    const Redirection output(STDOUT_FILENO, full);
    printf("lost");
    entry_.OutputBody();
  }
  {
    const Redirection output(STDOUT_FILENO, later);
    fflush(stdout);
  }
  clearerr(stdout);
  EXPECT_EQ(purged, stdout);
  EXPECT_EQ(SyslogCapture::Count("cannot write the answer ["), 1);
  EXPECT_EQ(lseek(later, 0, SEEK_END), 0);
  close(full);
  close(later);
}

TEST_F(Output, ClientThatIsGoneIsNotLogged) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  close(ends[0]);
  {
    const BrokenPipe tolerated;
    const Redirection output(STDOUT_FILENO, ends[1]);
    entry_.OutputHeader();
    entry_.OutputBody();
  }
  close(ends[1]);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(Output, BodyThatWasWrittenIsNotPurged) {
  purged = nullptr;
  EXPECT_EQ(PrintedBody(), "{}");
  EXPECT_EQ(purged, nullptr);
}

TEST_F(Output, RestartAsksTheWebServersController) {
  RestartHttpd(nullptr);
  EXPECT_EQ(platform->calls, (Lines{"Engine()", "RestartService()"}));
}

TEST_F(Output, RestartPassesTheEnginesExceptionOn) {
  platform->engineThrows = true;
  EXPECT_THROW(RestartHttpd(nullptr), std::runtime_error);
  EXPECT_EQ(Calls("RestartService"), 0);
}

}  // namespace
}  // namespace QELO
