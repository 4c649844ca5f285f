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
  for (const char* text : {"012", "%2B1", "1.", ".5", "-", "-a", "1e", "1e%2B", "0x10", "1 ", " 1",
                           "1_000", "1,5", "--1", "-0", "NaN", "Infinity", "-Infinity", "00"}) {
    EXPECT_EQ(value(text), '"' + URLDecode(text, true) + '"') << text;
  }
}

TEST(ParameterValue, RealsOfUpTo15DigitsAreNumbers) {
  EXPECT_EQ(value("1.5"), "1.5");
  EXPECT_EQ(value("-0.25"), "-0.25");
  EXPECT_EQ(value("1e3"), "1000.0");
  EXPECT_EQ(value("1E%2B3"), "1000.0");
  EXPECT_EQ(value("25e-2"), "0.25");
  EXPECT_EQ(value("0.0"), "0.0");
  Json::Value object;
  EXPECT_TRUE(strPairToJsonObj("v=0.00123456789012345", object, true, true));
  EXPECT_DOUBLE_EQ(object["v"].asDouble(), 0.00123456789012345);
}

TEST(ParameterValue, RealThatWouldLoseDigitsStaysAString) {
  EXPECT_EQ(value("1.234567890123456"), R"("1.234567890123456")");
  EXPECT_EQ(value("1e400"), R"("1e400")");
  EXPECT_EQ(value("1e-400"), R"("1e-400")");
  EXPECT_EQ(value("1e-310"), R"("1e-310")");
}

TEST(ParameterValue, ArrayWithANumberThatWouldLoseDigitsStaysAString) {
  EXPECT_EQ(value("[18446744073709551616]"), R"("[18446744073709551616]")");
  EXPECT_EQ(value("[012]"), R"("[012]")");
  EXPECT_EQ(value(R"({"a":1.2345678901234567})"), R"("{\"a\":1.2345678901234567}")");
}

TEST(ParameterValue, DigitsInAStringOfAnArrayAreNoNumber) {
  EXPECT_EQ(value(R"(["18446744073709551616","a\"012",-1])"),
            R"(["18446744073709551616","a\"012",-1])");
}

}  // namespace
}  // namespace QELO::WebAPIUtil
