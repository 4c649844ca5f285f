// Streams: regular files that are open already, and what has no length.

#include <fcntl.h>
#include <unistd.h>

#include "tests/unit/platform/fileoutput/Fixture.h"

namespace QELO {
namespace {

class Streams : public FileOutput {
 protected:
  static std::FILE* Open(const char* mode = "re") { return fopen(Path("content").c_str(), mode); }
};

TEST_F(Streams, RegularFileHasALengthRangesAndValidators) {
  std::FILE* file = Open();
  CgiAnswer answer = SendStream(file);
  EXPECT_EQ(result, 0);
  EXPECT_EQ(answer.Body(), "0123456789");
  EXPECT_EQ(Header(answer, "Content-Length"), "10");
  EXPECT_EQ(Header(answer, "Accept-Ranges"), "bytes");
  EXPECT_EQ(Header(answer, "Content-Disposition"), "attachment");
  EXPECT_EQ(Header(answer, "ETag"), Header(Send("content"), "ETag"));
  setenv("HTTP_RANGE", "bytes=2-3", 1);
  answer = SendStream(file);
  EXPECT_EQ(Header(answer, "Content-Range"), "bytes 2-3/10");
  EXPECT_EQ(answer.Body(), "23");
  fclose(file);
}

TEST_F(Streams, RegularFileIsSentFromTheStreamsPositionOn) {
  std::FILE* file = Open();
  ASSERT_EQ(fgetc(file), '0');
  ASSERT_EQ(fgetc(file), '1');
  CgiAnswer answer = SendStream(file);
  EXPECT_EQ(answer.Body(), "23456789");
  EXPECT_EQ(Header(answer, "Content-Length"), "8");
  EXPECT_NE(Header(answer, "ETag"), Header(Send("content"), "ETag"));
  setenv("HTTP_RANGE", "bytes=0-1,-1", 1);
  EXPECT_NE(SendStream(file).Body().find("bytes 0-1/8\r\n\r\n23\r\n"), std::string::npos);
  setenv("HTTP_RANGE", "bytes=-99", 1);
  EXPECT_EQ(SendStream(file).Body(), "23456789");
  unsetenv("HTTP_RANGE");
  ASSERT_EQ(fseeko(file, 99, SEEK_SET), 0);
  answer = SendStream(file);
  EXPECT_EQ(Header(answer, "Content-Length"), "0");
  EXPECT_EQ(result, 0);
  fclose(file);
}

TEST_F(Streams, WhatWasWrittenToAFileIsThere) {
  std::FILE* file = tmpfile();
  fputs("written", file);
  ASSERT_EQ(fseeko(file, 0, SEEK_SET), 0);
  EXPECT_EQ(SendStream(file).Body(), "written");
  fputs("more", file);
  EXPECT_EQ(SendStream(file).Body(), "ten");  // "morewr" stands before
  fclose(file);
}

TEST_F(Streams, StaysTheCallers) {
  std::FILE* file = Open();
  fgetc(file);
  SendStream(file);
  EXPECT_EQ(fgetc(file), '1');
  EXPECT_EQ(fclose(file), 0);
}

TEST_F(Streams, WithoutALengthIsSentUntilItsEnd) {
  setenv("HTTP_RANGE", "bytes=0-1", 1);
  setenv("HTTP_IF_NONE_MATCH", "\"a\"", 1);
  for (const size_t size : {0, 1, 65535, 65536, 65537, 300000}) {
    std::FILE* pipe = popen(("yes | head -c " + std::to_string(size)).c_str(), "r");
    const CgiAnswer answer = SendStream(pipe);
    EXPECT_EQ(pclose(pipe), 0);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(answer.Body().size(), size);
    EXPECT_EQ(Status(answer), "200");
    EXPECT_EQ(Header(answer, "Accept-Ranges"), "none");
    EXPECT_EQ(Header(answer, "Content-Length"), "(none)");
    EXPECT_EQ(Header(answer, "ETag"), "(none)");
    EXPECT_EQ(Header(answer, "Last-Modified"), "(none)");
  }
}

TEST_F(Streams, OfTheMemoryIsSent) {
  char text[] = "in memory";
  std::FILE* memory = fmemopen(text, sizeof text - 1, "r");
  EXPECT_EQ(fgetc(memory), 'i');
  EXPECT_EQ(SendStream(memory).Body(), "n memory");
  fclose(memory);
}

TEST_F(Streams, HeadRequestReadsNothing) {
  setenv("REQUEST_METHOD", "HEAD", 1);
  char text[] = "in memory";
  std::FILE* memory = fmemopen(text, sizeof text - 1, "r");
  EXPECT_EQ(SendStream(memory).Body(), "");
  EXPECT_EQ(fgetc(memory), 'i');
  fclose(memory);
}

TEST_F(Streams, LengthThatTheCallerKnowsIsTheMostThatIsSent) {
  char text[] = "in memory";
  std::FILE* memory = fmemopen(text, sizeof text - 1, "r");
  CgiAnswer answer = SendStream(memory, {"Content-Length: 4"});
  EXPECT_EQ(answer.Body(), "in m");
  EXPECT_EQ(Header(answer, "Content-Length"), "4");
  EXPECT_EQ(result, 0);
  answer = SendStream(memory, {"Content-Length: 6"});
  EXPECT_EQ(answer.Body(), "emory");
  EXPECT_EQ(result, HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count("the answer broke off: the file or stream has become shorter"), 1);
  rewind(memory);
  answer = SendStream(memory, {"Content-Length: -4"});
  EXPECT_EQ(answer.Body(), "in memory");
  EXPECT_EQ(Header(answer, "Content-Length"), "(none)");
  fclose(memory);
}

TEST_F(Streams, CallersValidatorsCount) {
  setenv("HTTP_IF_NONE_MATCH", "\"mine\"", 1);
  char text[] = "in memory";
  std::FILE* memory = fmemopen(text, sizeof text - 1, "r");
  const CgiAnswer answer = SendStream(memory, {"ETag: \"mine\""});
  EXPECT_EQ(Status(answer), "304");
  EXPECT_EQ(fgetc(memory), 'i');
  fclose(memory);
}

TEST_F(Streams, ThatCannotBeReadPrintNothing) {
  EXPECT_EQ(SendStream(nullptr).text, "");
  EXPECT_EQ(result, HTTPFileOutputer::kNothingSent);
  EXPECT_EQ(errno, EINVAL);
  std::FILE* file = Open("ae");
  EXPECT_EQ(SendStream(file).text, "");
  EXPECT_EQ(result, HTTPFileOutputer::kNothingSent);
  EXPECT_EQ(errno, EBADF);
  fclose(file);
}

TEST_F(Streams, ThatFailBreakOff) {
  std::FILE* directory = fdopen(open("/", O_RDONLY | O_CLOEXEC), "r");
  SendStream(directory);
  EXPECT_EQ(result, HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count("the answer broke off ["), 1);
  fclose(directory);
}

TEST_F(Streams, NameIsTheOneToSaveBy) {
  std::FILE* file = Open();
  const CgiAnswer answer =
      PrintedBy([&] { HTTPFileOutputer().Output(file, "dir/a.txt", "text/plain"); });
  EXPECT_EQ(Header(answer, "Content-Disposition"), "attachment; filename=\"a.txt\"");
  fclose(file);
}

}  // namespace
}  // namespace QELO
