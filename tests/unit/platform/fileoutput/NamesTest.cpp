// What a file's name says: its type, and how it is saved.

#include <unistd.h>

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

class FileNames : public FileOutput {
 protected:
  void SetUp() override {
    FileOutput::SetUp();
    unlink(Path("etc/mime.types").c_str());  // a link to the host's
  }

  static std::string Type(const std::string& name) { return HTTPFileOutputer::GetMimeType(name); }
  static std::string Attachment(const std::string& name) {
    const std::string value = HTTP::FileOutputerHelper::ContentDisposition(name, false);
    const std::string start = "attachment; filename=";
    EXPECT_EQ(value.substr(0, start.size()), start);
    return value.substr(start.size());
  }
};

constexpr char kUnknown[] = "application/octet-stream";

TEST_F(FileNames, TypeIsTheOneOfTheirEnding) {
  Write("etc/mime.types",
        "# a comment with dat\n"
        "text/html\t\thtml htm shtml\n"
        "application/gzip\tgz\n"
        "application/none\n"
        "image/png png # dat\n"
        "image/vnd.x+y\tx-y 7z\n"
        "video/last mkv",
        0644);
  EXPECT_EQ(Type("a.html"), "text/html");
  EXPECT_EQ(Type("a.htm"), "text/html");
  EXPECT_EQ(Type("/d.png/a.HTM"), "text/html");
  EXPECT_EQ(Type("a.tar.gz"), "application/gzip");
  EXPECT_EQ(Type("a.7z"), "image/vnd.x+y");
  EXPECT_EQ(Type("a.x-y"), "image/vnd.x+y");
  EXPECT_EQ(Type("a.mkv"), "video/last");
  for (const char* name : {"", "a", "html", ".html", "/d.html/a", "a.", "a.ht", "a.tml", "a.dat",
                           "a.#", "a.text/html", "a.html gz", "a.none", "a.\xc3\xa4", "a.html/"}) {
    EXPECT_EQ(Type(name), kUnknown) << name;
  }
  EXPECT_EQ(Type("a." + std::string(100, 'x')), kUnknown);
}

TEST_F(FileNames, TypeIsUnknownWithoutAList) {
  EXPECT_EQ(Type("a.html"), kUnknown);
  ASSERT_EQ(symlink("/dev/zero", Path("etc/mime.types").c_str()), 0);
  EXPECT_EQ(Type("a.html"), kUnknown);
}

TEST_F(FileNames, TypesOfTheHostAreThere) {
  ASSERT_EQ(symlink("/etc/mime.types", Path("etc/mime.types").c_str()), 0);
  EXPECT_EQ(Type("a.html"), "text/html");
  EXPECT_EQ(Type("a.jpg"), "image/jpeg");
  EXPECT_EQ(Type("a.pdf"), "application/pdf");
  EXPECT_EQ(Type("a.zip"), "application/zip");
}

TEST_F(FileNames, PlainOneIsInQuotes) {
  EXPECT_EQ(Attachment("a b.txt"), "\"a b.txt\"");
  EXPECT_EQ(Attachment("/d/../a;b,c='(1).txt"), "\"a;b,c='(1).txt\"");
}

TEST_F(FileNames, OfOtherScriptsAreEncoded) {
  EXPECT_EQ(Attachment("B\u00e4r.txt"), "\"B_r.txt\"; filename*=UTF-8''B%C3%A4r.txt");
  EXPECT_EQ(Attachment("\u6587\u66f8.pdf"), "\"__.pdf\"; filename*=UTF-8''%E6%96%87%E6%9B%B8.pdf");
  EXPECT_EQ(Attachment("\U0001f600"), "\"_\"; filename*=UTF-8''%F0%9F%98%80");
  EXPECT_EQ(Attachment("\u0645\u0644\u0641"), "\"___\"; filename*=UTF-8''%D9%85%D9%84%D9%81");
}

TEST_F(FileNames, QuotesAndEscapesEndNoText) {
  EXPECT_EQ(Attachment("a\"b.txt"), "\"a_b.txt\"; filename*=UTF-8''a%22b.txt");
  EXPECT_EQ(Attachment("a%41.txt"), "\"a_41.txt\"; filename*=UTF-8''a%2541.txt");
  EXPECT_EQ(Attachment("a\\b"), "\"a_b\"");
}

TEST_F(FileNames, WhatBreaksALineOrDeceivesIsReplaced) {
  EXPECT_EQ(Attachment(std::string("a\r\nX: y\0\x7f\t", 10)), "\"a__X: y___\"");
  EXPECT_EQ(Attachment("a\u202etxt.exe"), "\"a_txt.exe\"");
  EXPECT_EQ(Attachment("\xff"), "\"_\"; filename*=UTF-8''%EF%BF%BD");
}

TEST_F(FileNames, LongOnesAreCutBetweenCharacters) {
  EXPECT_EQ(Attachment(std::string(300, 'a')), "\"" + std::string(255, 'a') + "\"");
  std::string umlauts;
  for (int i = 0; i < 200; ++i) {
    umlauts += "\u00e4";
  }
  EXPECT_EQ(Attachment(umlauts).substr(0, 130), "\"" + std::string(127, '_') + "\";");
}

TEST_F(FileNames, EmptyOneIsLeftOut) {
  EXPECT_EQ(HTTP::FileOutputerHelper::ContentDisposition("", false), "attachment");
  EXPECT_EQ(HTTP::FileOutputerHelper::ContentDisposition("a/", true), "inline");
  EXPECT_EQ(HTTP::FileOutputerHelper::ContentDisposition("a", true), "inline; filename=\"a\"");
}

TEST_F(FileNames, OfAFileGoesAlong) {
  Put("B\u00e4r.txt", "x");
  EXPECT_EQ(Header(Send("B\u00e4r.txt"), "Content-Disposition"),
            "attachment; filename=\"B_r.txt\"; filename*=UTF-8''B%C3%A4r.txt");
}

}  // namespace
}  // namespace QELO
