#include "webapi/base/Utf8.h"

#include <gtest/gtest.h>

namespace QELO {
namespace {

constexpr char kBad[] = "\xEF\xBF\xBD";

/// So many replacements.
std::string bad(int count) {
  std::string text;
  for (int i = 0; i < count; ++i) {
    text += kBad;
  }
  return text;
}

TEST(RepairUtf8, ValidTextStays) {
  for (const char* text :
       {"", "plain", "\xC2\x80", "\xDF\xBF", "\xE0\xA0\x80", "\xED\x9F\xBF", "\xEE\x80\x80",
        "\xEF\xBF\xBF", "\xF0\x90\x80\x80", "\xF4\x8F\xBF\xBF"}) {
    EXPECT_EQ(RepairUtf8(text), text);
  }
  const std::string nul("a\0b", 3);
  EXPECT_EQ(RepairUtf8(nul), nul);
}

TEST(RepairUtf8, ByteThatStartsNothingIsReplaced) {
  EXPECT_EQ(RepairUtf8("a\xE9z"), "a" + bad(1) + "z");
  EXPECT_EQ(RepairUtf8("\x80"), bad(1));
  EXPECT_EQ(RepairUtf8("\xFF\xFE"), bad(2));
  EXPECT_EQ(RepairUtf8("\xF5\x80\x80\x80"), bad(4));
}

TEST(RepairUtf8, SequenceCutShortIsReplaced) {
  EXPECT_EQ(RepairUtf8("\xC3"), bad(1));
  EXPECT_EQ(RepairUtf8("\xE2\x82"), bad(2));
  EXPECT_EQ(RepairUtf8("\xF0\x9F\x98z"), bad(3) + "z");
  EXPECT_EQ(RepairUtf8("\xE2\x82\xC3\xA9"), bad(2) + "\xC3\xA9");
}

TEST(RepairUtf8, OverlongFormIsReplaced) {
  EXPECT_EQ(RepairUtf8("\xC0\xAF"), bad(2));
  EXPECT_EQ(RepairUtf8("\xC1\xBF"), bad(2));
  EXPECT_EQ(RepairUtf8("\xE0\x9F\xBF"), bad(3));
  EXPECT_EQ(RepairUtf8("\xF0\x8F\xBF\xBF"), bad(4));
}

TEST(RepairUtf8, SurrogateAndWhatLiesBeyondUnicodeAreReplaced) {
  EXPECT_EQ(RepairUtf8("\xED\xA0\x80"), bad(3));
  EXPECT_EQ(RepairUtf8("\xED\xBF\xBF"), bad(3));
  EXPECT_EQ(RepairUtf8("\xF4\x90\x80\x80"), bad(4));
}

}  // namespace
}  // namespace QELO
