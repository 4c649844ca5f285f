#include <gtest/gtest.h>

#include <clocale>
#include <string>

#include "webapi/platform/Core.h"

namespace {

std::string lowered(std::string text) {
  QLIBCStrCaseLower(text.data());
  return text;
}

}  // namespace

TEST(StrCaseLower, MakesAsciiLettersSmallAndLeavesAllElse) {
  EXPECT_EQ(lowered("AZaz @[`{ 09"), "azaz @[`{ 09");
  EXPECT_EQ(lowered(""), "");
  EXPECT_EQ(lowered("\xC3\x84\xFF\x80"), "\xC3\x84\xFF\x80");
}

TEST(StrCaseLower, DoesNotGoByTheLocale) {
  const char* latin = setlocale(LC_CTYPE, "de_DE.ISO-8859-1");  // null where it is not installed
  EXPECT_EQ(lowered("\xC4I"), "\xC4i") << (latin != nullptr ? latin : "C");
  setlocale(LC_CTYPE, "C");
}

TEST(StrCaseLower, EndsAtTheNul) {
  std::string text("AB\0CD", 5);
  QLIBCStrCaseLower(text.data());
  EXPECT_EQ(text, std::string("ab\0CD", 5));
}
