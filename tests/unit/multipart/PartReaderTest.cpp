// Bodies taken apart, in pieces of any size.

#include "platform/multipart/PartReader.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>

#include "platform/multipart/Limits.h"
#include "tests/unit/multipart/Form.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

constexpr size_t kSmallBuffer = UploadLimits::kHeader + 300;

/// "name=content;" of each part, files as "name/file=content;", and the result.
std::string Parts(const std::string& body, size_t piece, size_t buffer = kSmallBuffer) {
  size_t at = 0;
  PartReader reader(
      "B",
      [&](char* into, size_t size) {
        const size_t count = std::min({size, piece, body.size() - at});
        memcpy(into, body.data() + at, count);
        at += count;
        return static_cast<int64_t>(count);
      },
      buffer);
  std::string parts;
  PartHeader header;
  int fault = 0;
  for (bool isEnd = false; (fault = reader.Next(header, isEnd)) == 0 && !isEnd;) {
    parts += header.field + (header.fileName.empty() ? "" : "/" + header.fileName) + "=";
    fault = reader.ReadContent([&](std::string_view bytes) {
      parts += bytes;
      return 0;
    });
    if (fault != 0) {
      break;
    }
    parts += ";";
  }
  EXPECT_LE(reader.Position(), at);
  return parts + std::to_string(fault);
}

void ExpectParts(const std::string& body, const std::string& expected) {
  for (size_t piece = 1; piece <= std::min<size_t>(body.size() + 1, 120); ++piece) {
    EXPECT_EQ(Parts(body, piece), expected) << "in pieces of " << piece << ": " << body;
  }
}

TEST(PartReader, FieldsAndFilesInAnyOrder) {
  ExpectParts(Form::Field("a", "1") + Form::File("f", "x.bin", "file\r\ncontent") +
                  Form::Field("b", "2") + Form::File("g", "y", "") + Form::End(),
              "a=1;f/x.bin=file\r\ncontent;b=2;g/y=;0");
}

TEST(PartReader, FormWithoutParts) {
  ExpectParts(Form::End(), "0");
  ExpectParts("--B--", "0");
}

TEST(PartReader, PreambleAndEpilogueCountForNothing) {
  ExpectParts("This is text.\r\n--Bx\r\n" + Form::Field("a", "1") + Form::End() + "--B\r\nmore",
              "a=1;0");
  ExpectParts("\r\n" + Form::Field("a", "1") + "--B--trailing", "a=1;0");
}

TEST(PartReader, BlanksBehindABoundary) {
  ExpectParts("--B \t\r\nContent-Disposition: form-data; name=a\r\n\r\n1\r\n--B--  \r\n", "a=1;0");
}

TEST(PartReader, WhatOnlyBeginsLikeABoundaryIsContent) {
  for (const char* content :
       {"\r\n--", "\r\n--BB\r\n", "\r\n--B-\r\n", "x--B--", "x\r\n--B x", "\r\r\n--b\r\n", "\r",
        "\r\n", "\n--B--\r\n", "\r\n-", "\r\n--Bx\r\n--By", "--B-", "--Bx\r\n"}) {
    ExpectParts(Form::File("f", "x", content) + Form::Field("a", "1") + Form::End(),
                std::string("f/x=") + content + ";a=1;0");
  }
}

TEST(PartReader, PartWithoutContentMayLackItsLineEnd) {
  ExpectParts(
      "--B\r\nContent-Disposition: form-data; name=a\r\n\r\n--B\r\n"
      "Content-Disposition: form-data; name=b\r\n\r\n2\r\n--B--",
      "a=;b=2;0");
}

TEST(PartReader, ContentThatStartsLikeABoundaryRightBehindTheHeader) {
  ExpectParts("--B\r\nContent-Disposition: form-data; name=a\r\n\r\n--Bx\r\n--B--", "a=--Bx;0");
}

TEST(PartReader, ZeroBytesAreContent) {
  const std::string zeros(300, '\0');
  ExpectParts(Form::File("f", "x", zeros) + Form::End(), "f/x=" + zeros + ";0");
}

TEST(PartReader, BodyCutShortAnywhereIsMalformed) {
  const std::string body = Form::Field("a", "1") + Form::File("f", "x", "content") + "--B--";
  for (size_t length = 0; length < body.size(); ++length) {
    for (const size_t piece : {1, 7, 1000}) {
      EXPECT_TRUE(Parts(body.substr(0, length), piece).ends_with("-3")) << length;
    }
  }
}

TEST(PartReader, OtherBoundaryIsNoneOfOurs) {
  ExpectParts("--C\r\nContent-Disposition: form-data; name=a\r\n\r\n1\r\n--C--\r\n", "-3");
}

TEST(PartReader, BareLineFeedsAreNoLineEnds) {
  ExpectParts("--B\nContent-Disposition: form-data; name=a\n\n1\n--B--\n", "-3");
}

TEST(PartReader, HeaderWithoutAnEmptyLineIsMalformed) {
  ExpectParts("--B\r\n--B--\r\n", "-3");
  ExpectParts("--B\r\n\r\ncontent\r\n--B--\r\n", "-3");
}

TEST(PartReader, PreambleHasALimit) {
  const std::string rest = "\r\n" + Form::Field("a", "1") + Form::End();
  EXPECT_EQ(Parts(std::string(UploadLimits::kPreamble, 'p') + rest, 1000), "a=1;0");
  EXPECT_EQ(Parts(std::string(UploadLimits::kPreamble + 1, 'p') + rest, 1000), "-4");
}

TEST(PartReader, HeaderHasALimit) {
  const std::string start = "Content-Disposition: form-data; name=a\r\nX: ";
  const auto body = [&](size_t length) {
    return "--B\r\n" + start + std::string(length - start.size(), 'x') + "\r\n\r\n1\r\n--B--";
  };
  for (const size_t piece : {1, 5000, 100000}) {
    EXPECT_EQ(Parts(body(UploadLimits::kHeader), piece), "a=1;0");
    EXPECT_EQ(Parts(body(UploadLimits::kHeader + 1), piece), "-4");
  }
}

TEST(PartReader, ContentAroundTheBufferSizes) {
  for (size_t off = 0; off < 400; ++off) {
    const std::string content(kSmallBuffer - 200 + off, 'c');
    EXPECT_EQ(Parts(Form::File("f", "x", content) + Form::End(), kSmallBuffer * 2),
              "f/x=" + content + ";0")
        << content.size();
  }
}

TEST(PartReader, LinesThatBeginLikeABoundaryAreHandedOutTogether) {
  std::string content;
  for (int line = 0; line < 100; ++line) {
    content += "\r\n--Bx";
  }
  const std::string body = Form::File("f", "x", content) + Form::End();
  bool isGiven = false;
  PartReader reader("B", [&](char* into, size_t) -> int64_t {
    return isGiven ? 0 : (isGiven = true, static_cast<int64_t>(body.copy(into, body.size())));
  });
  PartHeader header;
  bool isEnd = false;
  ASSERT_EQ(reader.Next(header, isEnd), 0);
  int pieces = 0;
  EXPECT_EQ(reader.ReadContent([&](std::string_view bytes) {
    pieces += bytes == content ? 1 : 100;
    return 0;
  }),
            0);
  EXPECT_EQ(pieces, 1);
}

TEST(PartReader, FailureOfTheSourceIsTheResult) {
  PartReader reader("B", [](char*, size_t) { return int64_t{QELO_UPLOAD_BROKEN_OFF}; });
  PartHeader header;
  bool isEnd = false;
  EXPECT_EQ(reader.Next(header, isEnd), QELO_UPLOAD_BROKEN_OFF);
}

TEST(PartReader, FailureOfTheSinkIsTheResult) {
  const std::string body = Form::Field("a", "1") + Form::End();
  bool isGiven = false;
  PartReader reader("B", [&](char* into, size_t) -> int64_t {
    return isGiven ? 0 : (isGiven = true, static_cast<int64_t>(body.copy(into, body.size())));
  });
  PartHeader header;
  bool isEnd = false;
  ASSERT_EQ(reader.Next(header, isEnd), 0);
  EXPECT_EQ(reader.ReadContent([](std::string_view) { return int{QELO_UPLOAD_NO_SPACE}; }),
            QELO_UPLOAD_NO_SPACE);
}

}  // namespace
}  // namespace QELO::Platform
