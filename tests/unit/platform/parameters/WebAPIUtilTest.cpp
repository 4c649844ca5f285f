#include "webapi/platform/WebAPIUtil.h"

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/JsonHelper.h"

namespace QELO::WebAPIUtil {
namespace {

std::string pieces(const char* text, const char* separator) {
  return JsonHelper::toString(ParseToArray(text, separator));
}

TEST(URLDecode, EscapeInEitherCaseBecomesItsByte) {
  EXPECT_EQ(URLDecode("a%2fb%2Fc", false), "a/b/c");
  EXPECT_EQ(URLDecode("%00", false), std::string(1, '\0'));
  EXPECT_EQ(URLDecode("%e4%BD%a0", false), "\xe4\xbd\xa0");
}

TEST(URLDecode, PlusIsBlankOnlyWhenAsked) {
  EXPECT_EQ(URLDecode("a+b", true), "a b");
  EXPECT_EQ(URLDecode("a+b", false), "a+b");
  EXPECT_EQ(URLDecode("%2B", true), "+");
}

TEST(URLDecode, MalformedEscapeStays) {
  EXPECT_EQ(URLDecode("%", true), "%");
  EXPECT_EQ(URLDecode("%4", true), "%4");
  EXPECT_EQ(URLDecode("%zz%41", true), "%zzA");
  EXPECT_EQ(URLDecode("%4g", true), "%4g");
  EXPECT_EQ(URLDecode("%%41", true), "%A");
}

TEST(URLEncode, AllButTheUnreservedIsEscaped) {
  EXPECT_EQ(URLEncode("aZ09-_.~"), "aZ09-_.~");
  EXPECT_EQ(URLEncode(" /+%;="), "%20%2F%2B%25%3B%3D");
  EXPECT_EQ(URLEncode("\xe4\n"), "%E4%0A");
  EXPECT_EQ(URLEncode(std::string(1, '\0')), "%00");
  EXPECT_EQ(URLEncode(""), "");
}

TEST(URLEncode, DecodeGivesBackEveryByte) {
  std::string all;
  for (int byte = 0; byte < 256; ++byte) {
    all += static_cast<char>(byte);
  }
  EXPECT_EQ(URLDecode(URLEncode(all), true), all);
}

TEST(ParseToArray, BlanksAndTabsAroundPiecesGo) {
  EXPECT_EQ(pieces(" a=1;\tb=2 ; c d ", ";"), R"(["a=1","b=2","c d"])");
}

TEST(ParseToArray, EmptyPiecesAreLeftOut) {
  EXPECT_EQ(pieces(";;a; ;b;", ";"), R"(["a","b"])");
  EXPECT_EQ(pieces("", ";"), "[]");
  EXPECT_EQ(pieces(" ", ";"), "[]");
}

TEST(ParseToArray, SeparatorIsTakenAsAWhole) {
  EXPECT_EQ(pieces("a, b,c, d", ", "), R"(["a","b,c","d"])");
}

TEST(ParseToArray, WithoutSeparatorTheTextIsOnePiece) {
  EXPECT_EQ(pieces(" a;b ", ""), R"(["a;b"])");
  EXPECT_EQ(pieces(" a;b ", nullptr), R"(["a;b"])");
}

TEST(ParseToArray, NullTextGivesAnEmptyArray) {
  EXPECT_EQ(pieces(nullptr, ";"), "[]");
}

using ReadJson = PrivateRoot;

TEST_F(ReadJson, FileOfJsonIsRead) {
  Write("etc/x.json", R"({"a": [1]})");
  Json::Value value;
  EXPECT_TRUE(ReadJsonFile(Path("etc/x.json"), value));
  EXPECT_EQ(JsonHelper::toString(value), R"({"a":[1]})");
}

TEST_F(ReadJson, FailureLeavesTheValue) {
  Write("etc/x.json", "{");
  Json::Value value = "before";
  EXPECT_FALSE(ReadJsonFile(Path("etc/x.json"), value));
  EXPECT_FALSE(ReadJsonFile(Path("etc/missing.json"), value));
  EXPECT_EQ(value, Json::Value("before"));
}

}  // namespace
}  // namespace QELO::WebAPIUtil
