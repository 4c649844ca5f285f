#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>

#include "webapi/JsonHelper.h"

namespace QELO::JsonHelper {
namespace {

TEST(JsonWriter, RealNumbersHaveTheShortestDigitsThatReadBackTheSame) {
  EXPECT_EQ(toString(0.1), "0.1");
  EXPECT_EQ(toString(1.5), "1.5");
  EXPECT_EQ(toString(1e300), "1e+300");
  for (const double real : {0.1 + 0.2, 1.0 / 3, 1e-310, std::numeric_limits<double>::max()}) {
    Json::Value back;
    ASSERT_TRUE(fromString(toString(real), back)) << real;
    EXPECT_EQ(back.asDouble(), real);
  }
}

TEST(JsonWriter, WholeRealNumbersStayRealNumbers) {
  EXPECT_EQ(toString(3.0), "3.0");
  EXPECT_EQ(toString(-0.0), "-0.0");
  Json::Value back;
  ASSERT_TRUE(fromString(toString(3.0), back));
  EXPECT_EQ(back.type(), Json::realValue);
}

TEST(JsonWriter, NumbersThatJsonLacksAreNull) {
  EXPECT_EQ(toString(std::nan("")), "null");
  EXPECT_EQ(toString(-std::numeric_limits<double>::infinity()), "null");
}

TEST(JsonWriter, IntegersKeepAll64Bits) {
  EXPECT_EQ(toString(Json::Value(std::numeric_limits<Json::Int64>::min())), "-9223372036854775808");
  EXPECT_EQ(toString(Json::Value(std::numeric_limits<Json::UInt64>::max())),
            "18446744073709551615");
}

TEST(JsonWriter, EscapesWhatJsonMustAndNothingElse) {
  EXPECT_EQ(toString(Json::Value(std::string("a\"\\/\b\f\n\r\t\x01\x1f\0z", 13))),
            R"("a\"\\/\b\f\n\r\t\u0001\u001f\u0000z")");
  EXPECT_EQ(toString("\x7F\xC3\xBC\xF0\x9F\x98\x80"), "\"\x7F\xC3\xBC\xF0\x9F\x98\x80\"");
}

TEST(JsonWriter, MemberNamesAreEscapedLikeStrings) {
  Json::Value object;
  object[std::string("a\0\"", 3)] = Json::Value();
  EXPECT_EQ(toString(object), R"({"a\u0000\"":null})");
}

TEST(JsonWriter, EmptyContainers) {
  Json::Value value;
  value["array"] = Json::Value(Json::arrayValue);
  value["object"] = Json::Value(Json::objectValue);
  EXPECT_EQ(toString(value), R"({"array":[],"object":{}})");
}

Json::Value randomValue(std::mt19937& random, int depth) {
  switch (random() % (depth > 0 ? 8 : 6)) {
    case 0:
      return Json::Value();
    case 1:
      return random() % 2 == 0;
    case 2:
      return Json::Int64(random()) - Json::Int64(random());
    case 3:
      return std::ldexp(static_cast<double>(random()), static_cast<int>(random() % 200) - 100);
    case 4:
    case 5: {
      std::string text;
      for (unsigned length = random() % 12; length > 0; --length) {
        text += static_cast<char>(random() % 128);
      }
      return text;
    }
    case 6: {
      Json::Value array(Json::arrayValue);
      for (unsigned size = random() % 4; size > 0; --size) {
        array.append(randomValue(random, depth - 1));
      }
      return array;
    }
    default: {
      Json::Value object(Json::objectValue);
      for (unsigned size = random() % 4; size > 0; --size) {
        object[std::to_string(random() % 100)] = randomValue(random, depth - 1);
      }
      return object;
    }
  }
}

TEST(JsonWriter, TextReadsBackAsTheSameValue) {
  std::mt19937 random(20);
  for (int i = 0; i < 5000; ++i) {
    const Json::Value value = randomValue(random, 4);
    Json::Value back;
    ASSERT_TRUE(fromString(toString(value), back)) << toString(value);
    EXPECT_EQ(toString(back), toString(value));
  }
}

}  // namespace
}  // namespace QELO::JsonHelper
