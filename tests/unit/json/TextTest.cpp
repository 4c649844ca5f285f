#include <gtest/gtest.h>

#include <sstream>
#include <string>

#include "webapi/JsonHelper.h"

using namespace QELO;

namespace {

/// What the text parses to, written again; "refused" when it is not taken.
std::string reparsed(const std::string& text) {
  Json::Value value;
  return JsonHelper::fromString(text, value) ? JsonHelper::toString(value) : "refused";
}

std::string nested(int depth, const std::string& inner) {
  return std::string(static_cast<size_t>(depth), '[') + inner +
         std::string(static_cast<size_t>(depth), ']');
}

}  // namespace

TEST(JsonToString, WritesCompactTextWithoutNewlineAtTheEnd) {
  Json::Value value;
  value["a"][0] = 1;
  value["a"][1] = "x y";
  value["b"] = Json::nullValue;
  EXPECT_EQ(JsonHelper::toString(value), R"({"a":[1,"x y"],"b":null})");
}

TEST(JsonToString, WritesUtf8AsItIs) {
  EXPECT_EQ(JsonHelper::toString("gr\xC3\xBC\xC3\x9F"), "\"gr\xC3\xBC\xC3\x9F\"");
}

TEST(JsonToString, EscapesQuotesBackslashesAndControlCharacters) {
  EXPECT_EQ(JsonHelper::toString(std::string("\"\\\n\0\x01", 5)), R"("\"\\\n\u0000\u0001")");
}

TEST(JsonToString, WritesTheWholeRangeOfIntegers) {
  Json::Value value(Json::arrayValue);
  value.append(Json::Value::minLargestInt);
  value.append(Json::Value::maxLargestUInt);
  EXPECT_EQ(JsonHelper::toString(value), "[-9223372036854775808,18446744073709551615]");
}

TEST(JsonFromString, TakesEveryKindOfValueWithBlanksAround) {
  EXPECT_EQ(reparsed(" {\"a\" : [ 1 , -2 ] }\r\n"), R"({"a":[1,-2]})");
  EXPECT_EQ(reparsed("\t12"), "12");
  EXPECT_EQ(reparsed("0"), "0");
  EXPECT_EQ(reparsed("-1.5e+1"), "-15.0");
  EXPECT_EQ(reparsed("\"x\\u0041\\n\""), R"("xA\n")");
  EXPECT_EQ(reparsed("true"), "true");
  EXPECT_EQ(reparsed("false"), "false");
  EXPECT_EQ(reparsed("null"), "null");
  EXPECT_EQ(reparsed("[]"), "[]");
  EXPECT_EQ(reparsed("{}"), "{}");
}

TEST(JsonFromString, RefusesTextAfterTheValue) {
  for (const char* text : {"{} x", "{}{}", "1 2", "{}]", "\"a\"b", "truex", "[1]@"}) {
    EXPECT_EQ(reparsed(text), "refused") << text;
  }
}

TEST(JsonFromString, RefusesANulAndWhateverFollows) {
  EXPECT_EQ(reparsed(std::string("{}\0", 3)), "refused");
  EXPECT_EQ(reparsed(std::string("{}\0x", 4)), "refused");
  EXPECT_EQ(reparsed(std::string("\"a\0b\"", 5)), "refused");
}

TEST(JsonFromString, RefusesWhatOnlyLooksLikeANumber) {
  for (const char* text : {"-", "[-]", "01", "-01", "1.", ".5", "+1", "1e", "1e+", "1.5.5", "1-2",
                           "--1", "0x10", "-true", "1e999", "NaN", "Infinity"}) {
    EXPECT_EQ(reparsed(text), "refused") << text;
  }
}

TEST(JsonFromString, RefusesBrokenStrings) {
  for (const char* text :
       {"\"abc", "\"a\nb\"", R"("\x")", R"("\u12")", R"("\u12g4")", R"("\u-123")", R"("\ud800")",
        R"("\udc00")", R"("\ud800\u0041")", R"("\ud800x")", "'a'", "\"\\"}) {
    EXPECT_EQ(reparsed(text), "refused") << text;
  }
}

TEST(JsonFromString, RefusesBrokenListsAndObjects) {
  for (const char* text :
       {"", "  ", "[1,]", "[,1]", "[1 2]", "[", "]", "[1", "{", "{,}", "{\"a\":1,}", "{\"a\" 1}",
        "{\"a\"}", "{1:2}", "{[1]", "{\"a\":1 \"b\":2}"}) {
    EXPECT_EQ(reparsed(text), "refused") << text;
  }
}

TEST(JsonFromString, RefusesCommentsAndAByteOrderMark) {
  for (const char* text : {"1 // c", "/* c */ 1", "{/**/}", "\xEF\xBB\xBF{}"}) {
    EXPECT_EQ(reparsed(text), "refused") << text;
  }
}

TEST(JsonFromString, TakesNestingUpToTheLimitAndRefusesDeeper) {
  EXPECT_EQ(reparsed(nested(JsonHelper::kMaxDepth, "1")), nested(JsonHelper::kMaxDepth, "1"));
  EXPECT_EQ(reparsed(nested(JsonHelper::kMaxDepth + 1, "")), "refused");
  EXPECT_EQ(reparsed(nested(100000, "1")), "refused");
  EXPECT_EQ(reparsed(std::string(100000, '[')), "refused");
}

TEST(JsonFromString, CountsNestingOfObjectsAsOfLists) {
  std::string text = "1";
  for (int depth = 0; depth < JsonHelper::kMaxDepth; ++depth) {
    text = "{\"a\":" + text + "}";
  }
  EXPECT_EQ(reparsed(text), text);
  EXPECT_EQ(reparsed("[" + text + "]"), "refused");
}

TEST(JsonFromString, CountsNestingNotSiblings) {
  std::string text = "[[]";
  for (int i = 0; i < 2 * JsonHelper::kMaxDepth; ++i) {
    text += ",[]";
  }
  text += "]";
  EXPECT_EQ(reparsed(text), text);
}

TEST(JsonFromString, LeavesTheValueWhenItRefuses) {
  Json::Value value("kept");
  EXPECT_FALSE(JsonHelper::fromString("{\"a\":1", value));
  EXPECT_FALSE(JsonHelper::fromString(nested(300, ""), value));
  EXPECT_EQ(value, Json::Value("kept"));
}

TEST(JsonFromString, ReadsEscapesAsTheCharactersTheyStandFor) {
  Json::Value value;
  ASSERT_TRUE(
      JsonHelper::fromString(R"("\"\\\/\b\f\n\r\t\u0041\u00e9\u20AC\ud83d\uDE00\u0000.")", value));
  EXPECT_EQ(value.asString(),
            std::string("\"\\/\b\f\n\r\tA\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80\0.", 20));
}

TEST(JsonFromString, ReadsIntegersAsTheJsonLibraryHasThem) {
  const auto typeOf = [](const char* text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value.type();
  };
  EXPECT_EQ(typeOf("2147483647"), Json::intValue);
  EXPECT_EQ(typeOf("2147483648"), Json::uintValue);
  EXPECT_EQ(typeOf("18446744073709551615"), Json::uintValue);
  EXPECT_EQ(typeOf("18446744073709551616"), Json::realValue);
  EXPECT_EQ(typeOf("-2147483649"), Json::intValue);
  EXPECT_EQ(typeOf("-9223372036854775808"), Json::intValue);
  EXPECT_EQ(typeOf("-9223372036854775809"), Json::realValue);
  EXPECT_EQ(typeOf("1.0"), Json::realValue);
  EXPECT_EQ(typeOf("1e2"), Json::realValue);
}

TEST(JsonFromString, TakesTheSmallestRealsForZeroAndRefusesTheLargest) {
  EXPECT_EQ(reparsed("1e-999"), "0.0");
  EXPECT_EQ(reparsed("4.9e-324"), "5e-324");
  EXPECT_EQ(reparsed("1e999"), "refused");
  EXPECT_EQ(reparsed("-1e999"), "refused");
}

TEST(JsonFromString, AgreesWithTheJsonLibraryOnWhatBothTake) {
  for (const char* text :
       {"{}", "[]", "null", "[1,[2,{\"a\":[]}],\"x\"]", R"({"b":true,"a":false,"c":{"":0}})",
        "[0.5,-0.25,1e3,12345678901234567890,-7]", R"(["\u00fc\n",""])"}) {
    Json::Value ours;
    Json::Value theirs;
    std::istringstream stream(text);
    stream >> theirs;
    ASSERT_TRUE(JsonHelper::fromString(text, ours)) << text;
    EXPECT_EQ(ours, theirs) << text;
  }
}

TEST(JsonFromString, LastOfTwoEqualNamesWins) {
  EXPECT_EQ(reparsed(R"({"a":[1],"a":{"b":2}})"), R"({"a":{"b":2}})");
  EXPECT_EQ(reparsed(R"({"a":1,"a":2})"), R"({"a":2})");
}

TEST(JsonFromString, ReadsBackWhatToStringWrote) {
  Json::Value value;
  value["text"] = std::string("\0\x1f\"\\/\xC3\xBC", 7);
  value["real"] = 0.1;
  value["least"] = Json::Value::minLargestInt;
  value["most"] = Json::Value::maxLargestUInt;
  value["list"].append(Json::objectValue);
  Json::Value again;
  ASSERT_TRUE(JsonHelper::fromString(JsonHelper::toString(value), again));
  EXPECT_EQ(again, value);
}

TEST(JsonRepairUtf8, ReplacesWhatIsNoCharacter) {
  EXPECT_EQ(JsonHelper::repairUtf8("na\xEFve"), "na\xEF\xBF\xBDve");
  EXPECT_EQ(JsonHelper::repairUtf8("na\xC3\xAFve"), "na\xC3\xAFve");
}
