#include <gtest/gtest.h>

#include "programs/webapi-exec/Text.h"

namespace QELO::ExecProgram {
namespace {

TEST(ExecText, HarmlessKeepsLettersOfAllKinds) {
  for (const char* text : {"", "photos/1.jpg", "größe", "写真", "e\u0301", "\U0001F4F7"}) {
    EXPECT_EQ(harmless(text), text);
  }
}

TEST(ExecText, HarmlessReplacesControlCharacters) {
  EXPECT_EQ(harmless("\x1b[2J\r\n\t\x7f"), "?[2J????");
  EXPECT_EQ(harmless(std::string("a\0b", 3)), "a?b");
  EXPECT_EQ(harmless("\u009b31m"), "?31m");
}

TEST(ExecText, HarmlessReplacesWhatTurnsOrHidesText) {
  for (const char* text : {"\u202e", "\u2066", "\u200b", "\u200f", "\u061c", "\ufeff", "\u2028",
                           "\u00ad", "\U000e0041"}) {
    EXPECT_EQ(harmless(text), "?") << text;
  }
}

TEST(ExecText, HarmlessReplacesBytesThatAreNoUtf8) {
  EXPECT_EQ(harmless("a\xff\xc3.\xe2\x82"), "a??.??");
  EXPECT_EQ(harmless("\xed\xa0\x80"), "???");
}

TEST(ExecText, HarmlessBoundsTheMarksOfALetter) {
  EXPECT_EQ(harmless("a\u0301\u0302\u0303\u0304b"), "a\u0301\u0302b");
  EXPECT_EQ(harmless("\u0301b"), "b");
}

TEST(ExecText, ColumnsAreThoseOfATerminal) {
  EXPECT_EQ(columnsOf("abc"), 3U);
  EXPECT_EQ(columnsOf("größe"), 5U);
  EXPECT_EQ(columnsOf("写真"), 4U);
  EXPECT_EQ(columnsOf("e\u0301"), 1U);
}

TEST(ExecText, FrontAndBackKeepWhatFits) {
  EXPECT_EQ(frontOf("abcdefgh", 8), "abcdefgh");
  EXPECT_EQ(frontOf("abcdefgh", 7), "abcd...");
  EXPECT_EQ(backOf("abcdefgh", 8), "abcdefgh");
  EXPECT_EQ(backOf("abcdefgh", 7), "...efgh");
  EXPECT_EQ(frontOf("abcdefgh", 2), "..");
  EXPECT_EQ(backOf("abcdefgh", 0), "");
}

TEST(ExecText, FrontAndBackCutNoCharacter) {
  EXPECT_EQ(frontOf("写真写真", 6), "写...");
  EXPECT_EQ(backOf("写真写真", 6), "...真");
  EXPECT_EQ(backOf("abcde\u0301fg", 5), "...fg");
  EXPECT_EQ(backOf("abcde\u0301fg", 6), "...e\u0301fg");
}

}  // namespace
}  // namespace QELO::ExecProgram
