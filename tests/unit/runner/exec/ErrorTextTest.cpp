#include <gtest/gtest.h>

#include <cstring>
#include <fstream>
#include <regex>
#include <set>
#include <string>

#include "webapi/WebAPIErrorText.h"

namespace QELO {
namespace {

/// The codes that the header's enumeration names.
std::set<int> declaredCodes() {
  std::ifstream file(SOURCE_DIR "/include/webapi/WebAPIError.h");
  const std::string text(std::istreambuf_iterator<char>(file), {});
  const std::regex pattern("WEBAPI_ERR_[A-Z_]+ = ([0-9]+)");
  std::set<int> codes;
  for (std::sregex_iterator it(text.begin(), text.end(), pattern), end; it != end; ++it) {
    codes.insert(std::stoi((*it)[1]));
  }
  return codes;
}

TEST(ErrorMeanings, EveryDeclaredCodeHasOne) {
  const std::set<int> codes = declaredCodes();
  EXPECT_GE(codes.size(), 24u);
  for (const int code : codes) {
    EXPECT_STRNE(WebAPIErrorText(code), "unknown error") << code;
  }
}

TEST(ErrorMeanings, StandInOrderOnceEachOnOneLine) {
  int last = -1;
  std::set<std::string> texts;
  for (const WebAPIErrorMeaning& meaning : kWebAPIErrorMeanings) {
    EXPECT_GT(meaning.code, last);
    last = meaning.code;
    EXPECT_TRUE(texts.insert(meaning.text).second) << meaning.text;
    EXPECT_GT(strlen(meaning.text), 5u) << meaning.code;
    EXPECT_LT(strlen(meaning.text), 60u) << meaning.code;
    EXPECT_EQ(strchr(meaning.text, '\n'), nullptr) << meaning.code;
  }
}

TEST(ErrorMeanings, OtherCodesAreTheAPIsOwnOrUnknown) {
  EXPECT_STREQ(WebAPIErrorText(400), "an error of the API's own");
  EXPECT_STREQ(WebAPIErrorText(508), "an error of the API's own");
  EXPECT_STREQ(WebAPIErrorText(399), "unknown error");
  EXPECT_STREQ(WebAPIErrorText(120), "unknown error");
  EXPECT_STREQ(WebAPIErrorText(-1), "unknown error");
}

}  // namespace
}  // namespace QELO
