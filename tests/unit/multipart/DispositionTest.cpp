// What the header of a form's part says, as browsers and programs write it.

#include "platform/multipart/Disposition.h"

#include <gtest/gtest.h>

#include "platform/multipart/Limits.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

int Read(const std::string& parameters, PartHeader& header) {
  return readPartHeader("Content-Disposition: form-data; " + parameters, header);
}

/// Field and file name, as "FIELD|NAME", or the fault's number.
std::string Names(const std::string& parameters) {
  PartHeader header;
  const int fault = Read(parameters, header);
  return fault != 0 ? std::to_string(fault) : header.field + "|" + header.fileName;
}

TEST(PartHeader, FileNamesAsClientsWriteThem) {
  const struct {
    const char* parameters;
    const char* names;
  } kCases[] = {
      {R"(name="n")", "n|"},
      {R"(name=n)", "n|"},
      {R"(name = "n" ; filename = "a.txt")", "n|a.txt"},
      {R"(NAME="n"; FileName="a.txt";)", "n|a.txt"},
      {R"(name="n"; filename="")", "n|"},
      {R"(name="n"; filename=a.txt)", "n|a.txt"},
      {R"(name="n"; filename="日本語 ü.txt")", "n|日本語 ü.txt"},
      // Browsers: three characters are written as escapes, and a "%" stays.
      {R"(name="a%22b"; filename="c%22d%0D%0a.txt")", "a\"b|c\"d\r\n.txt"},
      {R"(name="n"; filename="100%25%2.txt")", "n|100%25%2.txt"},
      // Older programs: backslashes before quotes and backslashes.
      {R"(name="n"; filename="say \"hi\".txt")", "n|say \"hi\".txt"},
      {R"(name="n"; filename="semi;colon.txt"; x=y)", "n|semi;colon.txt"},
      // With folders in front.
      {R"(name="n"; filename="/srv/me/a.txt")", "n|a.txt"},
      {R"(name="n"; filename="../../etc/passwd")", "n|passwd"},
      {R"(name="n"; filename="C:\Users\me\a.txt")", "n|a.txt"},
      {R"(name="n"; filename="\\\\server\\share\\a.txt")", "n|a.txt"},
      {R"(name="n"; filename="folder/a.txt")", "n|a.txt"},
      // RFC 8187.
      {R"(name="n"; filename*=UTF-8''na%C3%AFve%20file.txt)", "n|naïve file.txt"},
      {R"(name="n"; filename*=utf-8'en'%e2%82%ac%22.txt; filename="euro.txt")", "n|€\".txt"},
      {R"(name="n"; filename="euro.txt"; filename*=iso-8859-1''%A3.txt)", "n|£.txt"},
      {R"(name="n"; filename*=UTF-8''..%2Fa.txt)", "n|a.txt"},
      {R"(name="n"; filename="good.txt"; filename*=EBCDIC''bad)", "n|good.txt"},
      {R"(name="n"; filename="good.txt"; filename*=UTF-8''%zz)", "n|good.txt"},
      {R"(name="n"; filename="good.txt"; filename*=UTF-8''a%0)", "n|good.txt"},
      {R"(name="n"; filename="good.txt"; filename*=UTF-8''a%00b)", "n|good.txt"},
      {R"(name="n"; filename="good.txt"; filename*=text)", "n|good.txt"},
  };
  for (const auto& each : kCases) {
    EXPECT_EQ(Names(each.parameters), each.names) << each.parameters;
  }
}

TEST(PartHeader, WhatIsNoneIsMalformed) {
  for (const char* parameters :
       {"", R"(name="")", "name=", R"(filename="a.txt")", R"(name="n)", R"(name="n"x)", "name",
        R"(name="n"; filename="..")", R"(name="n"; filename=".")", R"(name="n"; filename="a/")",
        R"(name="n"; filename="C:\")", R"(name="n"; filename="a/..")"}) {
    EXPECT_EQ(Names(parameters), "-3") << parameters;
  }
  PartHeader header;
  for (const std::string& text :
       {std::string(), std::string("X: y"), std::string("no colon"),
        std::string("Content-Disposition: attachment; name=\"n\""),
        std::string("Content-Disposition: form-data; name=\"n\"\r\nContent-Disposition: "
                    "form-data; name=\"m\""),
        std::string("Content-Disposition: form-data; name=\"n\"\r\nContent-Transfer-Encoding: "
                    "base64"),
        std::string(" folded: first\r\nContent-Disposition: form-data; name=\"n\""),
        std::string("Content-Disposition: form-data; name=\"n\"\rX: y"),
        std::string("Content-Disposition: form-data; name=\"n\0m\"", 42)}) {
    EXPECT_EQ(readPartHeader(text, header), QELO_UPLOAD_MALFORMED) << text;
  }
}

TEST(PartHeader, LinesMayGoOnAndOthersMayStandBeside) {
  PartHeader header;
  EXPECT_EQ(readPartHeader("content-type: text/plain\r\nCONTENT-DISPOSITION:form-data;\r\n"
                           "\tname=\"n\";\r\n filename=\"a.txt\"\r\n"
                           "Content-Transfer-Encoding: Binary",
                           header),
            0);
  EXPECT_EQ(header.field + "|" + header.fileName, "n|a.txt");
}

TEST(PartHeader, NamesHaveLimits) {
  PartHeader header;
  const auto name = [](size_t length) { return "name=\"" + std::string(length, 'n') + "\""; };
  const auto file = [](size_t length) {
    return "name=\"n\"; filename=\"" + std::string(length, 'f') + "\"";
  };
  EXPECT_EQ(Read(name(UploadLimits::kFieldName), header), 0);
  EXPECT_EQ(Read(name(UploadLimits::kFieldName + 1), header), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Read(file(UploadLimits::kFileName), header), 0);
  EXPECT_EQ(Read(file(UploadLimits::kFileName + 1), header), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Read(name(UploadLimits::kFileField) + "; filename=a", header), 0);
  EXPECT_EQ(Read(name(UploadLimits::kFileField + 1) + "; filename=a", header),
            QELO_UPLOAD_TOO_LARGE);
}

TEST(PartHeader, LinesHaveALimit) {
  PartHeader header;
  std::string text = "Content-Disposition: form-data; name=\"n\"";
  for (size_t line = 1; line < UploadLimits::kHeaderLines; ++line) {
    text += "\r\nX: y";
  }
  EXPECT_EQ(readPartHeader(text, header), 0);
  EXPECT_EQ(readPartHeader(text + "\r\nX: y", header), QELO_UPLOAD_TOO_LARGE);
}

TEST(Boundary, IsTheContentTypesParameter) {
  const std::string longest(UploadLimits::kBoundary, 'b');
  EXPECT_EQ(boundaryOf("multipart/form-data; boundary=x"), "x");
  EXPECT_EQ(boundaryOf("multipart/form-data;charset=utf-8; Boundary=\"a b\"; x=y"), "a b");
  EXPECT_EQ(boundaryOf("multipart/form-data; boundary=----WebKitFormBoundaryAb1"),
            "----WebKitFormBoundaryAb1");
  EXPECT_EQ(boundaryOf("multipart/form-data; boundary=" + longest), longest);
}

TEST(Boundary, ThatMayBeNoneIsNone) {
  for (const std::string& type :
       {std::string(), std::string("multipart/form-data"), std::string("boundary=x"),
        std::string("multipart/form-data; boundary="), std::string("multipart/form-data; boundary"),
        std::string("multipart/form-data; boundary=\"x"),
        std::string("multipart/form-data; boundary=\"x \""),
        std::string("multipart/form-data; boundary=\"x\r\n\""),
        std::string("multipart/form-data; boundary=\xC3\xA4"),
        "multipart/form-data; boundary=" + std::string(UploadLimits::kBoundary + 1, 'b')}) {
    EXPECT_EQ(boundaryOf(type), "") << type;
  }
}

}  // namespace
}  // namespace QELO::Platform
