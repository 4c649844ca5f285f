#include <gtest/gtest.h>

#include "webapi/JsonHelper.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::WebAPIUtil {
namespace {

/// The object that a line gives as JSON text, "refused" when the line is malformed.
std::string parsed(const std::string& line, bool decode = true, bool parseJson = true) {
  Json::Value object;
  return strPairToJsonObj(line, object, decode, parseJson) ? JsonHelper::toString(object)
                                                           : "refused";
}

/// The JSON text of the value of "v=...".
std::string value(const std::string& text) {
  Json::Value object;
  EXPECT_TRUE(strPairToJsonObj("v=" + text, object, true, true));
  return JsonHelper::toString(object["v"]);
}

TEST(ParameterLine, PairsBecomeMembers) {
  EXPECT_EQ(parsed("api=QELO.X&method=get"), R"({"api":"QELO.X","method":"get"})");
}

TEST(ParameterLine, EmptyLineGivesAnEmptyObject) {
  EXPECT_EQ(parsed(""), "{}");
}

TEST(ParameterLine, EmptyPiecesAreSkipped) {
  EXPECT_EQ(parsed("&&a=b&&"), R"({"a":"b"})");
}

TEST(ParameterLine, PieceWithoutEqualsHasAnEmptyValue) {
  EXPECT_EQ(parsed("a&b="), R"({"a":"","b":""})");
}

TEST(ParameterLine, ValueGoesOnBehindASecondEquals) {
  EXPECT_EQ(parsed("a=b=c"), R"({"a":"b=c"})");
}

TEST(ParameterLine, EmptyNameIsKept) {
  EXPECT_EQ(parsed("=x"), R"({"":"x"})");
}

TEST(ParameterLine, LaterNameReplacesEarlier) {
  EXPECT_EQ(parsed("a=x&a=y"), R"({"a":"y"})");
}

TEST(ParameterLine, SemicolonIsNoSeparator) {
  EXPECT_EQ(parsed("a=1;b=2"), R"({"a":"1;b=2"})");
}

TEST(ParameterLine, NamesAndValuesAreDecodedWhenAsked) {
  EXPECT_EQ(parsed("a%20b=c+d%26"), R"({"a b":"c d&"})");
  EXPECT_EQ(parsed("a%20b=c+d%26", false), R"({"a%20b":"c+d%26"})");
}

TEST(ParameterLine, MalformedEscapeRefusesTheLine) {
  EXPECT_EQ(parsed("a=%zz"), "refused");
  EXPECT_EQ(parsed("a=%4"), "refused");
  EXPECT_EQ(parsed("%=a"), "refused");
  EXPECT_EQ(parsed("ok=1&a=%"), "refused");
  EXPECT_EQ(parsed("a=%zz", false), R"({"a":"%zz"})");
}

TEST(ParameterLine, RefusedLineLeavesTheObject) {
  Json::Value object;
  object["kept"] = 1;
  EXPECT_FALSE(strPairToJsonObj("a=1&b=%", object, true, true));
  EXPECT_EQ(JsonHelper::toString(object), R"({"kept":1})");
}

TEST(ParameterLine, MembersAreAddedToTheObject) {
  Json::Value object;
  object["kept"] = 1;
  object["old"] = "x";
  EXPECT_TRUE(strPairToJsonObj("old=y&new=z", object, true, true));
  EXPECT_EQ(JsonHelper::toString(object), R"({"kept":1,"new":"z","old":"y"})");
}

TEST(ParameterLine, OnlyAnObjectOrNullTakesMembers) {
  for (const Json::Value& other : {Json::Value("text"), Json::Value(Json::arrayValue)}) {
    Json::Value object = other;
    EXPECT_FALSE(strPairToJsonObj("a=1", object, true, true));
    EXPECT_EQ(object, other);
  }
}

TEST(ParameterLine, ZeroByteIsKept) {
  Json::Value object;
  EXPECT_TRUE(strPairToJsonObj("a%00b=c%00d", object, true, true));
  const std::string name("a\0b", 3);
  ASSERT_TRUE(object.isMember(name));
  EXPECT_EQ(object[name].asString(), std::string("c\0d", 3));
}

TEST(ParameterValue, TextStaysAString) {
  EXPECT_EQ(value("report"), R"("report")");
  EXPECT_EQ(value(""), R"("")");
  EXPECT_EQ(value("True"), R"("True")");
  EXPECT_EQ(value("nul"), R"("nul")");
  EXPECT_EQ(value("nullx"), R"("nullx")");
}

TEST(ParameterValue, WithoutJsonAllIsAString) {
  EXPECT_EQ(parsed("a=1&b=[1]&c=true", true, false), R"({"a":"1","b":"[1]","c":"true"})");
}

TEST(ParameterValue, JsonTextBecomesItsValue) {
  EXPECT_EQ(value("true"), "true");
  EXPECT_EQ(value("false"), "false");
  EXPECT_EQ(value("null"), "null");
  EXPECT_EQ(value(R"("a b")"), R"("a b")");
  EXPECT_EQ(value(R"({"a":[1,"x"]})"), R"({"a":[1,"x"]})");
  EXPECT_EQ(value("[]"), "[]");
}

TEST(ParameterValue, BrokenJsonStaysAString) {
  EXPECT_EQ(value("[1"), R"("[1")");
  EXPECT_EQ(value("{}x"), R"("{}x")");
  EXPECT_EQ(value(R"("open)"), R"("\"open")");
  EXPECT_EQ(value("{'a':1}"), R"("{'a':1}")");
}

TEST(ParameterValue, NestingBeyondTheLimitStaysAString) {
  const std::string deep =
      std::string(JsonHelper::kMaxDepth + 1, '[') + std::string(JsonHelper::kMaxDepth + 1, ']');
  EXPECT_EQ(value(deep), '"' + deep + '"');
  const std::string bottomless(5000, '[');
  EXPECT_EQ(value(bottomless), '"' + bottomless + '"');
}

TEST(ParameterValue, IntegersOf64BitsAreNumbers) {
  EXPECT_EQ(value("0"), "0");
  EXPECT_EQ(value("-12"), "-12");
  EXPECT_EQ(value("9223372036854775807"), "9223372036854775807");
  EXPECT_EQ(value("-9223372036854775808"), "-9223372036854775808");
  EXPECT_EQ(value("18446744073709551615"), "18446744073709551615");
}

TEST(ParameterValue, IntegerThatFitsNoTypeStaysAString) {
  EXPECT_EQ(value("18446744073709551616"), R"("18446744073709551616")");
  EXPECT_EQ(value("-9223372036854775809"), R"("-9223372036854775809")");
}

TEST(ParameterValue, WhatJsonDoesNotCallANumberStaysAString) {
  for (const char* text : {"012", "%2B1", "1.", ".5", "-", "-a", "1e", "1e%2B", "0x10", "1_000",
                           "1,5", "--1", "-0", "NaN", "Infinity", "-Infinity", "00"}) {
    EXPECT_EQ(value(text), '"' + URLDecode(text, true) + '"') << text;
  }
}

TEST(ParameterValue, BlanksAroundAJsonTextArePartOfIt) {
  for (const char* text : {" 1", "1 ", "%0a1%0d%09", "++1"}) {
    EXPECT_EQ(value(text), "1") << text;
  }
  EXPECT_EQ(value(" [1, 2] "), "[1,2]");
  EXPECT_EQ(value("%20%22a%22"), R"("a")");
  EXPECT_EQ(value(" {}"), "{}");
  EXPECT_EQ(value("\ttrue"), "true");
  EXPECT_EQ(value(" "), R"(" ")");
  EXPECT_EQ(value(" report"), R"(" report")");
  EXPECT_EQ(value("%0b1"), R"("\u000b1")");
}

TEST(ParameterValue, RealThatKeepsItsDigitsIsANumber) {
  for (const char* text :
       {"1.5", "-0.25", "0.00123456789012345", "0.30000000000000004", "1763761560.123456",
        "1763761560.1234567", "1.234567890123456", "1.7976931348623157e%2B308", "5e-324",
        "2.2250738585072014e-308", "1e-310", "-0.0", "0.0"}) {
    Json::Value object;
    EXPECT_TRUE(strPairToJsonObj(std::string("v=") + text, object, true, true));
    EXPECT_TRUE(object["v"].isDouble()) << text;
    EXPECT_EQ(object["v"].asDouble(), std::strtod(URLDecode(text, true).c_str(), nullptr)) << text;
  }
}

TEST(ParameterValue, RealMayBeWrittenInOtherFormsOfTheSameValue) {
  EXPECT_EQ(value("1e3"), "1000.0");
  EXPECT_EQ(value("1E%2B3"), "1000.0");
  EXPECT_EQ(value("25e-2"), "0.25");
  EXPECT_EQ(value("1.50"), "1.5");
  EXPECT_EQ(value("1000000000000000000000.0"), "1e+21");
  EXPECT_EQ(value("0.00000000000000000000000000000015e%2B30"), "0.15");
  // All the digits that the double nearest to a tenth has.
  EXPECT_EQ(value("0.1000000000000000055511151231257827021181583404541015625"), "0.1");
}

TEST(ParameterValue, RealThatWouldLoseDigitsStaysAString) {
  for (const char* text :
       {"1.23456789012345678", "0.300000000000000041", "1763761560.12345678", "1e400", "-1e400",
        "1e-400", "4e-324", "0.10000000000000000555111512312578270211815834045410156251",
        "9007199254740993.0", "1e99999999999999999999", "1e-99999999999999999999"}) {
    EXPECT_EQ(value(text), '"' + std::string(text) + '"') << text;
  }
}

TEST(ParameterValue, NumberOfEndlessDigitsStaysAString) {
  const std::string digits = "0." + std::string(1'000'000, '1');
  EXPECT_EQ(value(digits), '"' + digits + '"');
  EXPECT_EQ(value("1." + std::string(1'000'000, '0')), "1.0");
}

TEST(ParameterValue, ArrayWithANumberThatWouldLoseDigitsStaysAString) {
  EXPECT_EQ(value("[18446744073709551616]"), R"("[18446744073709551616]")");
  EXPECT_EQ(value("[012]"), R"("[012]")");
  EXPECT_EQ(value(R"({"a":1.23456789012345678})"), R"("{\"a\":1.23456789012345678}")");
  EXPECT_EQ(value(R"({"a":[0.30000000000000004]})"), R"({"a":[0.30000000000000004]})");
}

TEST(ParameterValue, DigitsInAStringOfAnArrayAreNoNumber) {
  EXPECT_EQ(value(R"(["18446744073709551616","a\"012",-1])"),
            R"(["18446744073709551616","a\"012",-1])");
}

/// An array of so many zeros, without blanks.
std::string zeros(size_t count) {
  std::string text = "[0";
  for (size_t i = 1; i < count; ++i) {
    text += ",0";
  }
  return text + "]";
}

TEST(ParameterLimits, OneValueMoreRefusesTheLine) {
  Json::Value object;
  EXPECT_TRUE(strPairToJsonObj("v=" + zeros(kMostValues - 1), object, true, true));
  EXPECT_EQ(object["v"].size(), kMostValues - 1);
  object.clear();
  EXPECT_FALSE(strPairToJsonObj("v=" + zeros(kMostValues), object, true, true));
  EXPECT_FALSE(strPairToJsonObj("v=" + zeros(kMostValues - 1) + "&w=1", object, true, true));
  EXPECT_FALSE(strPairToJsonObj("v=" + zeros(kMostValues - 1) + "&w=text", object, true, true));
  EXPECT_TRUE(object.empty());
}

TEST(ParameterLimits, TextThatIsNoJsonIsOneValue) {
  Json::Value object;
  const std::string text = zeros(kMostValues - 10) + "x";
  EXPECT_TRUE(strPairToJsonObj("v=" + text + "&w=" + text, object, true, true));
  EXPECT_EQ(object["w"].asString(), text);
  EXPECT_TRUE(strPairToJsonObj("v=" + zeros(2 * kMostValues), object, true, false));
}

TEST(ParameterLimits, OneParameterMoreRefusesTheLine) {
  std::string line;
  for (size_t i = 0; i < kMostParameters; ++i) {
    line += "&p=";
  }
  Json::Value object;
  EXPECT_TRUE(strPairToJsonObj(line + "&&", object, true, true));
  object.clear();
  EXPECT_FALSE(strPairToJsonObj(line + "&p=", object, true, true));
  EXPECT_TRUE(object.empty());
}

}  // namespace
}  // namespace QELO::WebAPIUtil
