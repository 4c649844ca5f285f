#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include "webapi/JsonHelper.h"

using namespace QELO;

namespace {

constexpr int kFallback = 77;

Json::Value array(int member) {
  Json::Value value(Json::arrayValue);
  value.append(member);
  return value;
}

Json::Value object(int member) {
  Json::Value value(Json::objectValue);
  value["a"] = member;
  return value;
}

/// One value of every kind, the awkward ones included.
std::vector<Json::Value> everyKind() {
  return {Json::Value(),
          Json::Value(-1),
          Json::Value(Json::Value::minLargestInt),
          Json::Value(Json::Value::maxLargestUInt),
          Json::Value(1e30),
          Json::Value(-1e30),
          Json::Value(std::numeric_limits<double>::quiet_NaN()),
          Json::Value(std::numeric_limits<double>::infinity()),
          Json::Value(true),
          Json::Value(""),
          Json::Value("12x"),
          Json::Value(std::string("a\0b", 3)),
          array(1),
          object(1),
          Json::Value(Json::arrayValue),
          Json::Value(Json::objectValue)};
}

}  // namespace

TEST(JsonMember, GivesTheMemberOfAnObject) {
  EXPECT_EQ(JsonHelper::member(object(5), "a"), Json::Value(5));
  EXPECT_TRUE(JsonHelper::hasMember(object(5), "a"));
}

TEST(JsonMember, IsNullAndAbsentForAMissingName) {
  EXPECT_TRUE(JsonHelper::member(object(5), "b").isNull());
  EXPECT_FALSE(JsonHelper::hasMember(object(5), "b"));
  EXPECT_FALSE(JsonHelper::hasMember(object(5), ""));
}

TEST(JsonMember, CountsANullMemberAsPresent) {
  Json::Value value;
  value["a"] = Json::nullValue;
  EXPECT_TRUE(JsonHelper::hasMember(value, "a"));
}

TEST(JsonMember, FindsNamesThatAreEmptyOrHoldANul) {
  Json::Value value;
  value[""] = 1;
  value[std::string("a\0b", 3)] = 2;
  EXPECT_EQ(JsonHelper::member(value, ""), Json::Value(1));
  EXPECT_EQ(JsonHelper::member(value, std::string("a\0b", 3)), Json::Value(2));
  EXPECT_FALSE(JsonHelper::hasMember(value, "a"));
}

TEST(JsonMember, IsNullAndAbsentForWhateverIsNoObject) {
  for (const Json::Value& value : everyKind()) {
    if (!value.isObject()) {
      EXPECT_TRUE(JsonHelper::member(value, "a").isNull());
      EXPECT_FALSE(JsonHelper::hasMember(value, "a"));
    }
  }
}

TEST(JsonConversions, NeverThrow) {
  for (const Json::Value& value : everyKind()) {
    EXPECT_NO_THROW(JsonHelper::asString(value));
    EXPECT_NO_THROW(JsonHelper::asInt(value));
    EXPECT_NO_THROW(JsonHelper::asInt64(value));
    EXPECT_NO_THROW(JsonHelper::asUInt64(value));
    EXPECT_NO_THROW(JsonHelper::asBool(value));
    EXPECT_NO_THROW(JsonHelper::toString(value));
  }
}

TEST(JsonAsString, WritesNumbersAndBooleansAsJsonDoes) {
  EXPECT_EQ(JsonHelper::asString("x"), "x");
  EXPECT_EQ(JsonHelper::asString(-12), "-12");
  EXPECT_EQ(JsonHelper::asString(Json::Value::maxLargestUInt), "18446744073709551615");
  EXPECT_EQ(JsonHelper::asString(1.5), "1.5");
  EXPECT_EQ(JsonHelper::asString(3.0), "3.0");
  EXPECT_EQ(JsonHelper::asString(true), "true");
  EXPECT_EQ(JsonHelper::asString(std::string("a\0b", 3)), std::string("a\0b", 3));
}

TEST(JsonAsString, WritesARealWithTheDigitsOfTheTextForm) {
  for (const double real : {0.1, -2.3, 1e100, 1.0 / 3}) {
    EXPECT_EQ(JsonHelper::asString(real), JsonHelper::toString(real));
  }
  EXPECT_EQ(JsonHelper::asString(0.1), "0.1");
}

TEST(JsonAsString, GivesNullAsEmptyAndTheFallbackForListsAndObjects) {
  EXPECT_EQ(JsonHelper::asString(Json::nullValue, "fallback"), "");
  EXPECT_EQ(JsonHelper::asString(array(1), "fallback"), "fallback");
  EXPECT_EQ(JsonHelper::asString(object(1), "fallback"), "fallback");
}

TEST(JsonAsInt, TakesNumbersBooleansAndDecimalStrings) {
  EXPECT_EQ(JsonHelper::asInt(5), 5);
  EXPECT_EQ(JsonHelper::asInt(5u), 5);
  EXPECT_EQ(JsonHelper::asInt(-2.9), -2);
  EXPECT_EQ(JsonHelper::asInt(true), 1);
  EXPECT_EQ(JsonHelper::asInt(false, kFallback), 0);
  EXPECT_EQ(JsonHelper::asInt("12"), 12);
  EXPECT_EQ(JsonHelper::asInt("-12"), -12);
  EXPECT_EQ(JsonHelper::asInt("007"), 7);
}

TEST(JsonAsInt, FallsBackForAllElse) {
  for (const Json::Value& value :
       {Json::Value(), Json::Value(""), Json::Value("x"), Json::Value("12x"), Json::Value(" 12"),
        Json::Value("1.5"), Json::Value("+1"), Json::Value(std::string("1\0", 2)), array(1),
        object(1), Json::Value(NAN), Json::Value(INFINITY)}) {
    EXPECT_EQ(JsonHelper::asInt(value, kFallback), kFallback) << JsonHelper::toString(value);
  }
}

TEST(JsonAsInt, EndsAtTheBoundsOfThirtyTwoBits) {
  EXPECT_EQ(JsonHelper::asInt(INT64_C(2147483647)), INT32_MAX);
  EXPECT_EQ(JsonHelper::asInt(INT64_C(-2147483648)), INT32_MIN);
  EXPECT_EQ(JsonHelper::asInt(2147483647.5), INT32_MAX);
  EXPECT_EQ(JsonHelper::asInt(-2147483648.5), INT32_MIN);
  for (const Json::Value& value :
       {Json::Value(INT64_C(2147483648)), Json::Value(INT64_C(-2147483649)),
        Json::Value(2147483648.0), Json::Value(-2147483649.0), Json::Value("2147483648"),
        Json::Value(Json::Value::maxLargestUInt)}) {
    EXPECT_EQ(JsonHelper::asInt(value, kFallback), kFallback) << JsonHelper::toString(value);
  }
}

TEST(JsonAsInt64, EndsAtTheBoundsOfSixtyFourBits) {
  EXPECT_EQ(JsonHelper::asInt64(Json::Value::maxLargestInt), INT64_MAX);
  EXPECT_EQ(JsonHelper::asInt64(Json::Value::minLargestInt), INT64_MIN);
  EXPECT_EQ(JsonHelper::asInt64("9223372036854775807"), INT64_MAX);
  EXPECT_EQ(JsonHelper::asInt64(-9223372036854775808.0), INT64_MIN);
  EXPECT_EQ(JsonHelper::asInt64(UINT64_C(9223372036854775808), kFallback), kFallback);
  EXPECT_EQ(JsonHelper::asInt64(9223372036854775808.0, kFallback), kFallback);
  EXPECT_EQ(JsonHelper::asInt64("9223372036854775808", kFallback), kFallback);
}

TEST(JsonAsUInt64, TakesTheWholeRangeAndRefusesNegatives) {
  EXPECT_EQ(JsonHelper::asUInt64(Json::Value::maxLargestUInt), UINT64_MAX);
  EXPECT_EQ(JsonHelper::asUInt64("18446744073709551615"), UINT64_MAX);
  EXPECT_EQ(JsonHelper::asUInt64(-0.5, kFallback), 0u);
  for (const Json::Value& value : {Json::Value(-1), Json::Value(-1.0), Json::Value("-1"),
                                   Json::Value(18446744073709551616.0)}) {
    EXPECT_EQ(JsonHelper::asUInt64(value, kFallback), static_cast<uint64_t>(kFallback));
  }
}

TEST(JsonAsBool, TakesBooleansAndNumbers) {
  EXPECT_TRUE(JsonHelper::asBool(true));
  EXPECT_FALSE(JsonHelper::asBool(false, true));
  EXPECT_TRUE(JsonHelper::asBool(-3));
  EXPECT_TRUE(JsonHelper::asBool(0.5));
  EXPECT_FALSE(JsonHelper::asBool(0, true));
  EXPECT_FALSE(JsonHelper::asBool(0.0, true));
}

TEST(JsonAsBool, FallsBackForAllElse) {
  for (const Json::Value& value :
       {Json::Value(), Json::Value("true"), Json::Value("1"), array(1), object(1)}) {
    EXPECT_FALSE(JsonHelper::asBool(value));
    EXPECT_TRUE(JsonHelper::asBool(value, true));
  }
}
