#include <gtest/gtest.h>

#include "programs/webapi-exec/Text.h"
#include "programs/webapi-exec/follow/Progress.h"
#include "webapi/JsonHelper.h"

namespace QELO::ExecProgram {
namespace {

constexpr size_t kWide = 200;

Progress progressOf(const std::string& data) {
  Json::Value body;
  EXPECT_TRUE(JsonHelper::fromString(R"({"success": true, "data": )" + data + "}", body)) << data;
  return readProgress(body);
}

std::string lineOf(const std::string& data, size_t columns = kWide) {
  return progressLine(progressOf(data), 65, 0, columns);
}

TEST(ExecProgress, PercentIsThatOfTheCountsRoundedDown) {
  EXPECT_EQ(progressOf(R"({"files": {"done": 1, "total": 3}})").percent, 33);
  EXPECT_EQ(progressOf(R"({"files": {"done": 0, "total": 3}})").percent, 0);
  EXPECT_EQ(progressOf(R"({"files": {"done": 3, "total": 3}})").percent, 100);
  EXPECT_EQ(progressOf(R"({"files": {"done": 4, "total": 3}})").percent, 100);
  EXPECT_EQ(
      progressOf(R"({"n": {"done": 18446744073709551614, "total": 18446744073709551615}})").percent,
      99);
}

TEST(ExecProgress, BytesComeBeforeFilesBeforeOthers) {
  const Progress progress = progressOf(
      R"({"albums": {"done": 1, "total": 1}, "files": {"done": 1, "total": 2},
          "bytes": {"done": 1, "total": 4}})");
  EXPECT_EQ(progress.percent, 25);
  ASSERT_EQ(progress.counts.size(), 3U);
  EXPECT_EQ(progress.counts[0].name, "bytes");
  EXPECT_EQ(progress.counts[1].name, "files");
  EXPECT_EQ(progress.counts[2].name, "albums");
}

TEST(ExecProgress, CountOfNothingDoesNotCount) {
  EXPECT_EQ(
      progressOf(R"({"bytes": {"done": 0, "total": 0}, "files": {"done": 1, "total": 2}})").percent,
      50);
}

TEST(ExecProgress, PercentageCountsWithoutCounts) {
  EXPECT_EQ(progressOf(R"({"progress": 12})").percent, 12);
  EXPECT_EQ(progressOf(R"({"progress": 99.9})").percent, 99);
  EXPECT_EQ(progressOf(R"({"progress": 1e300})").percent, 100);
  EXPECT_EQ(progressOf(R"({"progress": -5})").percent, 0);
  EXPECT_EQ(progressOf(R"({"progress": 12, "files": {"done": 1, "total": 2}})").percent, 50);
}

TEST(ExecProgress, OtherTypesTellNothing) {
  for (
      const char* data :
      {"null", "[]", "5", "\"x\"", "{}", R"({"files": 5})", R"({"files": {"done": 1}})",
       R"({"files": {"done": "1", "total": 2}})", R"({"files": {"done": 1, "total": -2}})",
       R"({"files": [1, 2], "progress": "50", "seconds_left": "3", "state": {}, "current": []})"}) {
    const Progress progress = progressOf(data);
    EXPECT_EQ(progress.percent, -1) << data;
    EXPECT_TRUE(progress.counts.empty()) << data;
    EXPECT_EQ(progress.secondsLeft, -1) << data;
    EXPECT_EQ(progress.state + progress.current, "") << data;
  }
  EXPECT_EQ(readProgress(Json::Value("x")).percent, -1);
}

TEST(ExecProgress, LineTellsBarTimeCountsStateAndCurrent) {
  EXPECT_EQ(lineOf(R"({"files": {"done": 1, "total": 2}, "bytes": {"done": 512, "total": 1536},
                       "seconds_left": 3725, "state": "reading", "current": "a/b"})"),
            " 33% [#########.....................]  1:02:05 left  0.5/1.5 KiB"
            "  1/2 files  reading  a/b");
  EXPECT_EQ(lineOf(R"({"bytes": {"done": 7, "total": 1023}})", 50),
            "  0% [..........]  1:05  7/1023 B");
}

TEST(ExecProgress, CurrentComesBeforeStateWhenThereIsLittleRoom) {
  const std::string data = R"({"files": {"done": 1, "total": 2}, "state": "reading",
                               "current": "photos/summer/1.jpg"})";
  EXPECT_EQ(lineOf(data, 52), " 50% [#####.....]  1:05  1/2 files  .../summer/1.jpg");
  EXPECT_EQ(lineOf(data, 58), " 50% [#####......]  1:05  1/2 files  reading  ...mer/1.jpg");
  EXPECT_EQ(lineOf(data, 47), " 50% [#####.....]  1:05  1/2 files");
}

TEST(ExecProgress, LineWithoutForecastTellsTheTimeThatPassed) {
  EXPECT_EQ(lineOf(R"({"progress": 50})", 24), " 50% [#####.....]  1:05");
  EXPECT_EQ(lineOf(R"({"progress": 50})", 19), " 50% [######......]");
  EXPECT_EQ(lineOf(R"({"progress": 50})", 23), " 50% [########........]");
  EXPECT_EQ(lineOf(R"({"progress": 50})", 11), " 50%  1:05");
}

TEST(ExecProgress, LineWithoutNumbersTurns) {
  const Progress nothing;
  EXPECT_EQ(progressLine(nothing, 0, 0, kWide), "|  0:00");
  EXPECT_EQ(progressLine(nothing, 3, 1, kWide), "/  0:03");
  EXPECT_EQ(progressLine(nothing, 3600, 7, kWide), "\\  1:00:00");
}

TEST(ExecProgress, LineFitsIntoEveryWidth) {
  const Progress progress = progressOf(
      R"({"files": {"done": 1, "total": 2}, "写真": {"done": 1, "total": 2}, "seconds_left": 9,
          "state": "读取读取读取读取读取", "current": "很长的名字/很长的名字/很长的名字\u001b"})");
  for (size_t columns = 0; columns < kWide; ++columns) {
    const std::string line = progressLine(progress, 1, 0, columns);
    EXPECT_LE(columnsOf(line), columns) << line;
    EXPECT_EQ(harmless(line), line);
  }
}

TEST(ExecProgress, LongNameKeepsItsEnd) {
  const std::string line =
      lineOf(R"({"progress": 1, "current": "a-very-long-directory/and-a-name"})", 55);
  EXPECT_EQ(line, "  1% [...........]  1:05  ...-long-directory/and-a-name");
}

}  // namespace
}  // namespace QELO::ExecProgram
