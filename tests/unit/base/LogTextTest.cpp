#include "webapi/base/LogText.h"

#include <gtest/gtest.h>

namespace QELO {
namespace {

TEST(LogText, ShortTextStays) {
  EXPECT_EQ(LogText("QELO.Host.Info"), "QELO.Host.Info");
  const std::string longest(kLongestLogText, 'a');
  EXPECT_EQ(LogText(longest), longest);
}

TEST(LogText, ControlCharactersBeginNoLineOfTheirOwn) {
  EXPECT_EQ(LogText(std::string("a\nb\r\0c\x1b[m\x7f", 10)), "a?b??c?[m?");
  EXPECT_EQ(PrintableText("a\tb"), "a?b");
}

TEST(LogText, LongTextIsCutAndMarked) {
  const std::string text(1 << 20, 'a');
  EXPECT_EQ(LogText(text), std::string(kLongestLogText, 'a') + "... (1048576 bytes)");
  EXPECT_EQ(LogText(std::string(kLongestLogText + 1, 'a')),
            std::string(kLongestLogText, 'a') + "... (257 bytes)");
  EXPECT_EQ(PrintableText(text), text);
}

TEST(LogText, NoCharacterIsCutInTwo) {
  for (size_t before = kLongestLogText - 4; before <= kLongestLogText; ++before) {
    const std::string text = std::string(before, 'a') + "\xF0\x9F\x98\x80 and more";
    const std::string shown = LogText(text);
    const bool fits = before + 4 <= kLongestLogText;
    EXPECT_EQ(shown.find("\xF0\x9F\x98\x80") != std::string::npos, fits) << before;
    EXPECT_EQ(shown.find('\xF0') != std::string::npos, fits) << before;
  }
}

TEST(LogText, BytesThatAreNoCharactersAreCutAllTheSame) {
  EXPECT_LE(LogText(std::string(5000, '\x80')).size(), kLongestLogText + 20);
}

}  // namespace
}  // namespace QELO
