// Parts of a file.

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

class FileRanges : public FileOutput {
 protected:
  CgiAnswer Ask(const std::string& ranges) { return Send("content", {{"HTTP_RANGE", ranges}}); }

  /// Each part's "Content-Range" and bytes.
  static std::vector<std::pair<std::string, std::string>> PartsOf(const CgiAnswer& answer) {
    const std::string type = Header(answer, "Content-Type");
    const std::string start = "multipart/byteranges; boundary=";
    EXPECT_EQ(type.substr(0, start.size()), start);
    const std::string mark = "--" + type.substr(start.size());
    std::string body = answer.Body();
    EXPECT_EQ(Header(answer, "Content-Length"), std::to_string(body.size()));
    std::vector<std::pair<std::string, std::string>> parts;
    while (body.substr(0, mark.size() + 2) == mark + "\r\n") {
      const size_t head = body.find("\r\n\r\n");
      const size_t end = body.find("\r\n" + mark, head);
      EXPECT_NE(body.find("Content-Type: text/plain\r\n"), std::string::npos);
      const size_t range = body.find("Content-Range: ") + 15;
      parts.emplace_back(body.substr(range, body.find("\r\n", range) - range),
                         body.substr(head + 4, end - head - 4));
      body = body.substr(end + 2);
    }
    EXPECT_EQ(body, mark + "--\r\n");
    return parts;
  }
};

TEST_F(FileRanges, OneIsSentAlone) {
  struct Case {
    const char* wanted;
    const char* range;
    const char* bytes;
  };
  for (const Case& one :
       {Case{"bytes=0-0", "0-0", "0"}, Case{"bytes=2-4", "2-4", "234"},
        Case{"bytes=7-", "7-9", "789"}, Case{"bytes=-3", "7-9", "789"},
        Case{"bytes=-99", "0-9", "0123456789"}, Case{"bytes=0-", "0-9", "0123456789"},
        Case{"bytes=5-99", "5-9", "56789"}, Case{"BYTES=9-9", "9-9", "9"},
        Case{"bytes= 2-4 ,", "2-4", "234"}, Case{"bytes=,,2-4", "2-4", "234"},
        Case{"bytes=0-99999999999999999999999999", "0-9", "0123456789"},
        Case{"bytes=-99999999999999999999999999", "0-9", "0123456789"},
        Case{"bytes=99-,2-4", "2-4", "234"}, Case{"bytes=0-4,3-6,7-7", "0-7", "01234567"}}) {
    const CgiAnswer answer = Ask(one.wanted);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(Header(answer, "Status"), "206 Partial Content") << one.wanted;
    EXPECT_EQ(Header(answer, "Content-Range"), std::string("bytes ") + one.range + "/10");
    EXPECT_EQ(Header(answer, "Content-Length"), std::to_string(strlen(one.bytes)));
    EXPECT_EQ(Header(answer, "Content-Type"), "text/plain");
    EXPECT_EQ(answer.Body(), one.bytes) << one.wanted;
  }
}

TEST_F(FileRanges, SeveralAreParts) {
  using Parts = std::vector<std::pair<std::string, std::string>>;
  EXPECT_EQ(PartsOf(Ask("bytes=0-1,4-5,-1")),
            (Parts{{"bytes 0-1/10", "01"}, {"bytes 4-5/10", "45"}, {"bytes 9-9/10", "9"}}));
  EXPECT_EQ(PartsOf(Ask("bytes=8-9,0-1")), (Parts{{"bytes 8-9/10", "89"}, {"bytes 0-1/10", "01"}}));
  EXPECT_EQ(result, 0);
}

TEST_F(FileRanges, ThatOverlapOrTouchAreSentOnce) {
  using Parts = std::vector<std::pair<std::string, std::string>>;
  EXPECT_EQ(PartsOf(Ask("bytes=8-9,0-1,1-2,3-3")),
            (Parts{{"bytes 8-9/10", "89"}, {"bytes 0-3/10", "0123"}}));
  EXPECT_EQ(PartsOf(Ask("bytes=0-1,4-5,8-9,1-4")),
            (Parts{{"bytes 0-5/10", "012345"}, {"bytes 8-9/10", "89"}}));
}

TEST_F(FileRanges, BeyondTheFileAreRefused) {
  for (const char* ranges :
       {"bytes=10-", "bytes=10-11", "bytes=-0", "bytes=99-,-0", "bytes=99999999999999999999-"}) {
    const CgiAnswer answer = Ask(ranges);
    EXPECT_EQ(Header(answer, "Status"), "416 Range Not Satisfiable") << ranges;
    EXPECT_EQ(Header(answer, "Content-Range"), "bytes */10");
    EXPECT_EQ(Header(answer, "Content-Length"), "0");
    EXPECT_EQ(answer.Body(), "");
    EXPECT_EQ(result, 0);
  }
}

TEST_F(FileRanges, MalformedOnesCountForNothing) {
  for (const char* ranges :
       {"", "bytes", "bytes=", "bytes=,", "bytes=-", "bytes=x", "bytes=4-2", "bytes=1",
        "bytes=1-2-3", "bytes=+1-2", "bytes=1-+2", "bytes=0x1-2", "bytes=--1", "bytes=1 - 2",
        "items=0-1", "bytes 0-1", "bytes=0-1,x", "bytes=0-1;2-3", "bytes=0-1,bytes=3-4"}) {
    const CgiAnswer answer = Ask(ranges);
    EXPECT_EQ(Status(answer), "200") << ranges;
    EXPECT_EQ(answer.Body(), "0123456789");
  }
}

TEST_F(FileRanges, MoreThanAreReadCountForNothing) {
  Put("content", std::string(1000, 'x'));
  std::string ranges = "bytes=0-0";
  for (int i = 1; i < 64; ++i) {
    ranges += "," + std::to_string(2 * i) + "-" + std::to_string(2 * i);
  }
  EXPECT_EQ(PartsOf(Ask(ranges)).size(), 64U);
  EXPECT_EQ(Status(Ask(ranges + ",999-999")), "200");
  EXPECT_EQ(Status(Ask(ranges + ",-0")), "200");
}

TEST_F(FileRanges, OfAnEmptyFileAreTheWhole) {
  Put("content", "");
  for (const char* ranges : {"bytes=0-", "bytes=0-0", "bytes=-1"}) {
    const CgiAnswer answer = Ask(ranges);
    EXPECT_EQ(Status(answer), "200");
    EXPECT_EQ(Header(answer, "Content-Length"), "0");
  }
}

TEST_F(FileRanges, AreForGetAlone) {
  EXPECT_EQ(Send("content", {{"HTTP_RANGE", "bytes=0-1"}, {"REQUEST_METHOD", "POST"}}).Body(),
            "0123456789");
}

TEST_F(FileRanges, TakeThePlaceOfTheCallersStatus) {
  const CgiAnswer answer =
      Send("content", {{"HTTP_RANGE", "bytes=0-1"}}, {"Status: 200", "content-range: x"});
  EXPECT_EQ(Header(answer, "Status"), "206 Partial Content");
  EXPECT_EQ(Header(answer, "Content-Range"), "bytes 0-1/10");
}

TEST_F(FileRanges, OfALargeFileAreFound) {
  Put("content", "");
  ASSERT_EQ(truncate(Path("content").c_str(), 5LL << 30), 0);
  Age("content", 3600);
  const CgiAnswer answer = Ask("bytes=5368709118-");
  EXPECT_EQ(Header(answer, "Content-Range"), "bytes 5368709118-5368709119/5368709120");
  EXPECT_EQ(answer.Body(), std::string(2, '\0'));
}

}  // namespace
}  // namespace QELO
