// Requests for what has changed, or has not.

#include <sys/time.h>

#include <ctime>

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

constexpr char kNoneMatch[] = "HTTP_IF_NONE_MATCH";
constexpr char kMatch[] = "HTTP_IF_MATCH";
constexpr char kModified[] = "HTTP_IF_MODIFIED_SINCE";
constexpr char kUnmodified[] = "HTTP_IF_UNMODIFIED_SINCE";
constexpr char kIfRange[] = "HTTP_IF_RANGE";

class Conditions : public FileOutput {
 protected:
  void SetUp() override {
    FileOutput::SetUp();
    SetTime(784111777);  // Sun, 06 Nov 1994 08:49:37 GMT
    tag_ = Header(Send("content"), "ETag");
  }

  static void SetTime(time_t seconds) {
    const timeval times[] = {{seconds, 0}, {seconds, 0}};
    ASSERT_EQ(utimes(Path("content").c_str(), times), 0);
  }

  std::string StatusOf(const std::map<std::string, std::string>& request) {
    const CgiAnswer answer = Send("content", request);
    EXPECT_EQ(result, 0);
    if (Status(answer) != "200" && Status(answer) != "206") {
      EXPECT_EQ(answer.Body(), "");
    }
    return Status(answer);
  }

  std::string tag_;
};

TEST_F(Conditions, LastModifiedIsTheTimeOfTheFile) {
  EXPECT_EQ(Header(Send("content"), "Last-Modified"), "Sun, 06 Nov 1994 08:49:37 GMT");
  SetTime(time(nullptr) + 86400);
  const std::string date = Header(Send("content"), "Last-Modified");
  EXPECT_EQ(StatusOf({{kModified, date}}), "304");  // now, and no time that is still to come
  char today[40];
  const time_t now = time(nullptr);
  strftime(today, sizeof today, "%a, %d %b %Y", gmtime(&now));
  EXPECT_EQ(date.substr(0, 16), today);
}

TEST_F(Conditions, TagTellsStatesApart) {
  EXPECT_EQ(tag_.front(), '"');
  EXPECT_EQ(Header(Send("content"), "ETag"), tag_);
  SetTime(784111778);
  EXPECT_NE(Header(Send("content"), "ETag"), tag_);
  Put("other", "0123456789");
  Put("longer", "0123456789a");
  EXPECT_NE(Header(Send("other"), "ETag"), Header(Send("longer"), "ETag"));
}

TEST_F(Conditions, TagOfWhatWasJustWrittenIsWeak) {
  Put("content", "9876543210", 0);
  const std::string weak = Header(Send("content"), "ETag");
  EXPECT_EQ(weak.substr(0, 3), "W/\"");
  EXPECT_EQ(StatusOf({{kNoneMatch, weak}}), "304");
  EXPECT_EQ(StatusOf({{kMatch, weak}}), "412");
  EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kIfRange, weak}}), "200");
  EXPECT_EQ(
      StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kIfRange, Header(Send("content"), "Last-Modified")}}),
      "200");
}

TEST_F(Conditions, IfNoneMatch) {
  for (const std::string& list :
       {tag_, "W/" + tag_, "\"a\", " + tag_, "\"a,b\" ,," + tag_, std::string(" * ")}) {
    EXPECT_EQ(StatusOf({{kNoneMatch, list}}), "304") << list;
  }
  for (const std::string& list : {std::string("\"a\""), std::string("a"), std::string("\""),
                                  std::string("W/"), tag_.substr(1), tag_.substr(0, 5), "w/" + tag_,
                                  "x " + tag_, std::string("**"), std::string(",")}) {
    EXPECT_EQ(StatusOf({{kNoneMatch, list}}), "200") << list;
  }
}

TEST_F(Conditions, NotModifiedHasTheValidatorsAndNoContent) {
  const CgiAnswer answer = Send("content", {{kNoneMatch, tag_}}, {"A: 1"});
  EXPECT_EQ(Header(answer, "Status"), "304 Not Modified");
  EXPECT_EQ(Header(answer, "ETag"), tag_);
  EXPECT_EQ(Header(answer, "Last-Modified"), "Sun, 06 Nov 1994 08:49:37 GMT");
  EXPECT_EQ(Header(answer, "Cache-Control"), "private, no-cache");
  EXPECT_EQ(Header(answer, "A"), "1");
  EXPECT_EQ(answer.Head().find("Content-"), answer.Head().find("Content-Type-Options"));
  EXPECT_EQ(answer.Body(), "");
}

TEST_F(Conditions, IfModifiedSince) {
  for (const char* date : {"Sun, 06 Nov 1994 08:49:37 GMT", "Sunday, 06-Nov-94 08:49:37 GMT",
                           "Sun Nov  6 08:49:37 1994", "Sun, 06 Nov 1994 08:49:38 GMT",
                           "Fri, 01 Jan 2100 00:00:00 GMT"}) {
    EXPECT_EQ(StatusOf({{kModified, date}}), "304") << date;
  }
  for (const char* date :
       {"Sun, 06 Nov 1994 08:49:36 GMT", "yesterday", "", "Sun, 06 Nov 1994 08:49:37",
        "Sun, 06 Nov 1994 08:49:37 GMT+1", "Sun, 06 Xxx 1994 08:49:37 GMT",
        "Sun, 36 Nov 1994 08:49:37 GMT", "Sun, 06 Nov 1994 28:49:37 GMT", "784111777"}) {
    EXPECT_EQ(StatusOf({{kModified, date}}), "200") << date;
  }
  EXPECT_EQ(StatusOf({{kModified, std::string(10000, 'x')}}), "200");
}

TEST_F(Conditions, IfNoneMatchCountsBeforeIfModifiedSince) {
  EXPECT_EQ(StatusOf({{kNoneMatch, "\"a\""}, {kModified, "Sun, 06 Nov 1994 08:49:37 GMT"}}), "200");
}

TEST_F(Conditions, IfMatch) {
  EXPECT_EQ(StatusOf({{kMatch, tag_}}), "200");
  EXPECT_EQ(StatusOf({{kMatch, "*"}}), "200");
  EXPECT_EQ(StatusOf({{kMatch, "\"a\", " + tag_}}), "200");
  EXPECT_EQ(StatusOf({{kMatch, "\"a\""}}), "412");
  EXPECT_EQ(StatusOf({{kMatch, "W/" + tag_}}), "412");
}

TEST_F(Conditions, IfUnmodifiedSince) {
  EXPECT_EQ(StatusOf({{kUnmodified, "Sun, 06 Nov 1994 08:49:37 GMT"}}), "200");
  EXPECT_EQ(StatusOf({{kUnmodified, "Sun, 06 Nov 1994 08:49:36 GMT"}}), "412");
  EXPECT_EQ(StatusOf({{kUnmodified, "never"}}), "200");
  EXPECT_EQ(StatusOf({{kMatch, tag_}, {kUnmodified, "Sun, 06 Nov 1994 08:49:36 GMT"}}), "200");
}

TEST_F(Conditions, FailedOneHasAnEmptyBody) {
  const CgiAnswer answer = Send("content", {{kMatch, "\"a\""}}, {"Content-Disposition: inline"});
  EXPECT_EQ(Header(answer, "Status"), "412 Precondition Failed");
  EXPECT_EQ(Header(answer, "Content-Length"), "0");
  EXPECT_EQ(Header(answer, "Content-Type"), "text/plain");
  EXPECT_EQ(Header(answer, "Content-Disposition"), "(none)");
}

TEST_F(Conditions, OfAPostAreNoQuestionsOfACache) {
  EXPECT_EQ(StatusOf({{"REQUEST_METHOD", "POST"}, {kModified, "Sun, 06 Nov 1994 08:49:37 GMT"}}),
            "200");
  EXPECT_EQ(StatusOf({{"REQUEST_METHOD", "POST"}, {kNoneMatch, tag_}}), "412");
}

TEST_F(Conditions, OfNoRequestAreNone) {
  const std::map<std::string, std::string> call = {
      {"REQUEST_METHOD", ""}, {kMatch, "\"a\""}, {kNoneMatch, tag_}, {"HTTP_RANGE", "bytes=0-1"}};
  EXPECT_EQ(StatusOf(call), "200");
}

TEST_F(Conditions, ComeBeforeRanges) {
  EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kNoneMatch, tag_}}), "304");
  EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kMatch, "\"a\""}}), "412");
  EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=99-"}, {kMatch, tag_}}), "416");
}

TEST_F(Conditions, IfRange) {
  for (const std::string& good : {tag_, std::string("Sun, 06 Nov 1994 08:49:37 GMT")}) {
    EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kIfRange, good}}), "206") << good;
  }
  for (const std::string& other : {"W/" + tag_, std::string("\"a\""), std::string("*"),
                                   tag_ + ", \"a\"", std::string("Sun, 06 Nov 1994 08:49:36 GMT"),
                                   std::string("Sun, 06 Nov 1994 08:49:38 GMT")}) {
    EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=0-1"}, {kIfRange, other}}), "200") << other;
    EXPECT_EQ(StatusOf({{"HTTP_RANGE", "bytes=99-"}, {kIfRange, other}}), "200") << other;
  }
}

TEST_F(Conditions, AskForTheCallersValidatorsWhereItHasSome) {
  const std::vector<std::string> own = {"etag: \"mine\"",
                                        "last-modified: Tue, 08 Nov 1994 08:49:37 GMT"};
  EXPECT_EQ(Status(Send("content", {{kNoneMatch, "\"mine\""}}, own)), "304");
  EXPECT_EQ(Status(Send("content", {{kNoneMatch, tag_}}, own)), "200");
  EXPECT_EQ(Status(Send("content", {{kModified, "Mon, 07 Nov 1994 08:49:37 GMT"}}, own)), "200");
  EXPECT_EQ(Status(Send("content", {{kModified, "Tue, 08 Nov 1994 08:49:37 GMT"}}, own)), "304");
}

}  // namespace
}  // namespace QELO
