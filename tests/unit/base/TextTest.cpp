#include "webapi/base/Text.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "webapi/base/Hex.h"
#include "webapi/base/Number.h"

namespace QELO {
namespace {

std::vector<std::string> piecesOf(std::string_view text, std::string_view separator) {
  std::vector<std::string> pieces;
  while (!text.empty()) {
    pieces.emplace_back(TakePiece(text, separator));
  }
  return pieces;
}

TEST(Trim, TakesBlanksAroundAText) {
  EXPECT_EQ(Trim(" \ta b\t "), "a b");
  EXPECT_EQ(Trim("a b"), "a b");
  EXPECT_EQ(Trim(" a\n"), "a\n");
  EXPECT_EQ(Trim(" a\n", " \n"), "a");
}

TEST(Trim, NothingButBlanksIsEmpty) {
  EXPECT_EQ(Trim(""), "");
  EXPECT_EQ(Trim(" \t "), "");
}

TEST(TakePiece, TakesUpToTheSeparator) {
  using Pieces = std::vector<std::string>;
  EXPECT_EQ(piecesOf("a&b&c", "&"), (Pieces{"a", "b", "c"}));
  EXPECT_EQ(piecesOf("a", "&"), Pieces{"a"});
  EXPECT_EQ(piecesOf("&&a&", "&"), (Pieces{"", "", "a"}));
  EXPECT_EQ(piecesOf("a, b, c,d", ", "), (Pieces{"a", "b", "c,d"}));
  EXPECT_EQ(piecesOf("", "&"), Pieces{});
}

TEST(Characters, AreThoseOfAscii) {
  int alphanumeric = 0;
  int digits = 0;
  for (int c = 0; c < 256; ++c) {
    alphanumeric += IsAlphanumeric(static_cast<char>(c)) ? 1 : 0;
    digits += IsDigit(static_cast<char>(c)) ? 1 : 0;
  }
  EXPECT_EQ(alphanumeric, 62);
  EXPECT_EQ(digits, 10);
  for (const char c : {'0', '9', 'a', 'z', 'A', 'Z'}) {
    EXPECT_TRUE(IsAlphanumeric(c)) << c;
  }
  EXPECT_TRUE(IsDigit('0') && IsDigit('9'));
}

TEST(ParseNumber, TakesAWholeText) {
  int number = 7;
  EXPECT_TRUE(ParseNumber("-12", number));
  EXPECT_EQ(number, -12);
  unsigned char small = 0;
  EXPECT_TRUE(ParseNumber("255", small));
  EXPECT_EQ(small, 255);
  double real = 0;
  EXPECT_TRUE(ParseNumber("0.25e2", real));
  EXPECT_EQ(real, 25);
}

TEST(ParseNumber, LeavesTheNumberWhenTheTextIsNone) {
  for (const char* text : {"", " 1", "1 ", "+1", "1x", "0x1", "1.5", "-", "99999999999"}) {
    int number = 7;
    EXPECT_FALSE(ParseNumber(text, number)) << text;
    EXPECT_EQ(number, 7) << text;
  }
  unsigned char small = 7;
  EXPECT_FALSE(ParseNumber("256", small));
  EXPECT_FALSE(ParseNumber("-1", small));
  EXPECT_EQ(small, 7);
}

TEST(Hex, TextHasTwoDigitsForEachByte) {
  EXPECT_EQ(HexText({"\x00\x0f\xa5\xff", 4}), "000fa5ff");
  EXPECT_EQ(HexText(""), "");
  std::string text = "%";
  AppendHex(0xAB, kUpperHex, text);
  EXPECT_EQ(text, "%AB");
}

TEST(Hex, ValueIsOfADigitOfEitherCase) {
  EXPECT_EQ(HexValue('0'), 0);
  EXPECT_EQ(HexValue('9'), 9);
  EXPECT_EQ(HexValue('a'), 10);
  EXPECT_EQ(HexValue('F'), 15);
  for (const char c : {'g', 'G', '/', ':', '@', '`', ' ', '\0', '\x10', '\xE1'}) {
    EXPECT_EQ(HexValue(c), -1) << c;
  }
}

}  // namespace
}  // namespace QELO
