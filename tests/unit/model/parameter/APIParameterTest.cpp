#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIParameter.h"

using namespace QELO;

namespace {

/// The parameter that a JSON text gives, read without a validator.
template <typename T>
APIParameter<T> parsed(const std::string& text, Json::ValueType type = Json::nullValue) {
  APIParameter<T> parameter;
  parameter.CheckValueTypeAndGet(json(text), type, nullptr);
  return parameter;
}

/// Whether it is accepted with this value.
template <typename T>
bool accepts(const std::string& text, T value) {
  const APIParameter<T> parameter = parsed<T>(text);
  return parameter.IsSet() && !parameter.IsInvalid() && parameter == value;
}

/// Whether it is refused and no value taken.
template <typename T>
bool refuses(const std::string& text) {
  const APIParameter<T> parameter = parsed<T>(text);
  return parameter.IsSet() && parameter.IsInvalid() && parameter == T();
}

template <typename T>
class EveryParameter : public testing::Test {};
using Types = testing::Types<int, long long, unsigned int, unsigned long long, bool, double,
                             std::string, Json::Value>;
TYPED_TEST_SUITE(EveryParameter, Types);

/// A value of the type other than the initial one.
template <typename T>
T sample() {
  return T(1);
}
template <>
std::string sample() {
  return "x";
}

bool refuseAll(const int&) {
  return false;
}

int askedValue = 0;
bool acceptPositive(const int& value) {
  askedValue = value;
  return value > 0;
}

}  // namespace

TYPED_TEST(EveryParameter, HasNoFlagAndTheInitialValueAtFirst) {
  const APIParameter<TypeParam> parameter;
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_FALSE(parameter.IsReset());
  EXPECT_FALSE(parameter.IsInvalid());
  EXPECT_FALSE(parameter.IsDefault());
  EXPECT_EQ(parameter.Get(), TypeParam());
}

TYPED_TEST(EveryParameter, MarksSetTheirFlagAlone) {
  APIParameter<TypeParam> set, reset, invalid, def;
  set.MarkSet();
  reset.MarkReset();
  invalid.MarkInvalid();
  def.MarkDefault();
  const auto flags = [](const APIParameter<TypeParam>& p) {
    return std::to_string(p.IsSet()) + std::to_string(p.IsReset()) + std::to_string(p.IsInvalid()) +
           std::to_string(p.IsDefault());
  };
  EXPECT_EQ(flags(set), "1000");
  EXPECT_EQ(flags(reset), "0100");
  EXPECT_EQ(flags(invalid), "0010");
  EXPECT_EQ(flags(def), "0001");
}

TYPED_TEST(EveryParameter, SetDefaultFillsWhatWasNotSent) {
  APIParameter<TypeParam> parameter;
  EXPECT_TRUE(parameter.SetDefault(sample<TypeParam>()));
  EXPECT_TRUE(parameter.IsSet());
  EXPECT_TRUE(parameter.IsDefault());
  EXPECT_EQ(parameter.Get(), sample<TypeParam>());
}

TYPED_TEST(EveryParameter, SetDefaultIsRefusedWhenInvalid) {
  APIParameter<TypeParam> parameter;
  parameter.MarkInvalid();
  EXPECT_FALSE(parameter.SetDefault(sample<TypeParam>()));
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_FALSE(parameter.IsDefault());
  EXPECT_EQ(parameter.Get(), TypeParam());
}

TYPED_TEST(EveryParameter, CopyAndAssignmentTakeValueAndFlags) {
  APIParameter<TypeParam> parameter;
  parameter.SetDefault(sample<TypeParam>());
  parameter.MarkReset();
  const APIParameter<TypeParam> copy(parameter);
  APIParameter<TypeParam> assigned;
  assigned.MarkInvalid();
  assigned = parameter;
  for (const APIParameter<TypeParam>* p :
       {&copy, static_cast<const APIParameter<TypeParam>*>(&assigned)}) {
    EXPECT_TRUE(p->IsSet());
    EXPECT_TRUE(p->IsReset());
    EXPECT_FALSE(p->IsInvalid());
    EXPECT_TRUE(p->IsDefault());
    EXPECT_EQ(p->Get(), sample<TypeParam>());
  }
}

TYPED_TEST(EveryParameter, CopiesAreSeparate) {
  APIParameter<TypeParam> parameter;
  APIParameter<TypeParam> copy(parameter);
  copy.SetDefault(sample<TypeParam>());
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_EQ(parameter.Get(), TypeParam());
}

TYPED_TEST(EveryParameter, ComparesValuesNotFlags) {
  APIParameter<TypeParam> one, other, third;
  one.MarkInvalid();
  EXPECT_TRUE(one == other);
  EXPECT_FALSE(one != other);
  third.SetDefault(sample<TypeParam>());
  EXPECT_FALSE(one == third);
  EXPECT_TRUE(one != third);
  EXPECT_TRUE(third == sample<TypeParam>());
  EXPECT_FALSE(third != sample<TypeParam>());
  EXPECT_TRUE(third != TypeParam());
}

TYPED_TEST(EveryParameter, NullIsResetWithTheInitialValueAndNotInvalid) {
  APIParameter<TypeParam> parameter;
  EXPECT_TRUE(parameter.CheckValueTypeAndGet(Json::Value(), Json::arrayValue,
                                             [](const TypeParam&) { return false; }));
  EXPECT_TRUE(parameter.IsSet());
  EXPECT_TRUE(parameter.IsReset());
  EXPECT_FALSE(parameter.IsInvalid());
  EXPECT_EQ(parameter.Get(sample<TypeParam>()), TypeParam());
  EXPECT_TRUE(parameter.SetDefault(sample<TypeParam>()));
  EXPECT_FALSE(parameter.IsDefault());
  EXPECT_EQ(parameter.Get(), TypeParam());
}

TEST(ParameterValue, OfIntStaysWithinThirtyTwoBits) {
  EXPECT_TRUE(accepts<int>("2147483647", INT32_MAX));
  EXPECT_TRUE(accepts<int>("-2147483648", INT32_MIN));
  EXPECT_TRUE(refuses<int>("2147483648"));
  EXPECT_TRUE(refuses<int>("-2147483649"));
  EXPECT_TRUE(refuses<int>("18446744073709551615"));
}

TEST(ParameterValue, OfLongLongTakesTheWholeSignedRange) {
  EXPECT_TRUE(accepts<long long>("4294967296", 4294967296));
  EXPECT_TRUE(accepts<long long>("-5000000000", -5000000000));
  EXPECT_TRUE(accepts<long long>("9223372036854775807", INT64_MAX));
  EXPECT_TRUE(accepts<long long>("-9223372036854775808", INT64_MIN));
  EXPECT_TRUE(refuses<long long>("9223372036854775808"));
}

TEST(ParameterValue, OfUnsignedIntStaysWithinThirtyTwoBits) {
  EXPECT_TRUE(accepts<unsigned int>("0", 0));
  EXPECT_TRUE(accepts<unsigned int>("4294967295", UINT32_MAX));
  EXPECT_TRUE(refuses<unsigned int>("-1"));
  EXPECT_TRUE(refuses<unsigned int>("4294967296"));
  EXPECT_TRUE(refuses<unsigned int>("18446744073709551615"));
}

TEST(ParameterValue, OfUnsignedLongLongTakesTheWholeUnsignedRange) {
  EXPECT_TRUE(accepts<unsigned long long>("9223372036854775807", INT64_MAX));
  EXPECT_TRUE(accepts<unsigned long long>("18446744073709551615", UINT64_MAX));
  EXPECT_TRUE(refuses<unsigned long long>("-1"));
}

TEST(ParameterValue, OfIntegersIsNeverTakenFromAReal) {
  for (const char* real : {"3.0", "3.5", "1e2", "-1.0"}) {
    EXPECT_TRUE(refuses<int>(real)) << real;
    EXPECT_TRUE(refuses<long long>(real)) << real;
    EXPECT_TRUE(refuses<unsigned int>(real)) << real;
    EXPECT_TRUE(refuses<unsigned long long>(real)) << real;
  }
}

TEST(ParameterValue, OfIntegersIsNeverTakenFromAnotherType) {
  for (const char* other : {"\"3\"", "true", "[3]", "{}"}) {
    EXPECT_TRUE(refuses<int>(other)) << other;
    EXPECT_TRUE(refuses<long long>(other)) << other;
    EXPECT_TRUE(refuses<unsigned int>(other)) << other;
    EXPECT_TRUE(refuses<unsigned long long>(other)) << other;
  }
}

TEST(ParameterValue, OfTheUnsignedKindSuitsEveryIntegerButInt) {
  const Json::Value value(5u);
  APIParameter<int> small;
  EXPECT_FALSE(small.ParseValue(value, Json::intValue));
  APIParameter<long long> large;
  EXPECT_TRUE(large.ParseValue(value, Json::intValue));
  EXPECT_EQ(large.Get(), 5);
  APIParameter<unsigned int> natural;
  EXPECT_TRUE(natural.ParseValue(value, Json::intValue));
  EXPECT_EQ(natural.Get(), 5u);
}

TEST(ParameterValue, OfTheSignedKindKeepsTheUpperBounds) {
  APIParameter<int> number;
  EXPECT_TRUE(number.ParseValue(Json::Int64(2147483647), Json::intValue));
  EXPECT_FALSE(number.ParseValue(Json::Int64(2147483648), Json::intValue));
  EXPECT_EQ(number.Get(), INT32_MAX);
  APIParameter<unsigned int> natural;
  EXPECT_TRUE(natural.ParseValue(Json::Int64(4294967295), Json::intValue));
  EXPECT_FALSE(natural.ParseValue(Json::Int64(4294967296), Json::intValue));
  EXPECT_EQ(natural.Get(), UINT32_MAX);
}

TEST(ParameterValue, OfBoolIsABooleanOnly) {
  EXPECT_TRUE(accepts<bool>("true", true));
  EXPECT_TRUE(accepts<bool>("false", false));
  for (const char* other : {"1", "0", "\"true\"", "1.0", "[]"}) {
    EXPECT_TRUE(refuses<bool>(other)) << other;
  }
}

TEST(ParameterValue, OfDoubleIsAnyNumber) {
  EXPECT_TRUE(accepts<double>("3", 3.0));
  EXPECT_TRUE(accepts<double>("-2.5", -2.5));
  EXPECT_TRUE(accepts<double>("18446744073709551615", 18446744073709551615.0));
  for (const char* other : {"\"3\"", "true", "[]"}) {
    EXPECT_TRUE(refuses<double>(other)) << other;
  }
}

TEST(ParameterValue, OfDoubleIsComparedExactly) {
  const APIParameter<double> parameter = parsed<double>("0.1");
  EXPECT_TRUE(parameter == 0.1);
  EXPECT_TRUE(parameter != std::nextafter(0.1, 1.0));
}

TEST(ParameterValue, OfStringIsAStringOnly) {
  EXPECT_TRUE(accepts<std::string>("\"x\"", "x"));
  EXPECT_TRUE(accepts<std::string>("\"\"", ""));
  EXPECT_TRUE(accepts<std::string>("\"a\\u0000b\"", std::string("a\0b", 3)));
  for (const char* other : {"12", "true", "[\"x\"]", "{}"}) {
    EXPECT_TRUE(refuses<std::string>(other)) << other;
  }
}

TEST(ParameterValue, OfStringIsComparedByLengthAndBytes) {
  const APIParameter<std::string> parameter = parsed<std::string>("\"a\\u0000b\"");
  EXPECT_TRUE(parameter != std::string("a"));
  EXPECT_TRUE(parameter == std::string("a\0b", 3));
}

TEST(ParameterValue, OfJsonHasTheExpectedType) {
  EXPECT_EQ(parsed<Json::Value>("[1]", Json::arrayValue).Get(), json("[1]"));
  EXPECT_EQ(parsed<Json::Value>("{\"a\":1}", Json::objectValue).Get(), json("{\"a\":1}"));
  EXPECT_TRUE(parsed<Json::Value>("{}", Json::arrayValue).IsInvalid());
  EXPECT_TRUE(parsed<Json::Value>("[]", Json::objectValue).IsInvalid());
  EXPECT_TRUE(parsed<Json::Value>("\"x\"", Json::arrayValue).IsInvalid());
}

TEST(ParameterParse, LeavesTheValueAndTheFlagsWhenItRefuses) {
  APIParameter<int> parameter;
  EXPECT_TRUE(parameter.ParseValue(7, Json::intValue));
  EXPECT_FALSE(parameter.ParseValue("x", Json::intValue));
  EXPECT_EQ(parameter.Get(), 7);
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_FALSE(parameter.IsInvalid());
}

TEST(ParameterValidator, RefusalMakesInvalidButKeepsTheValue) {
  APIParameter<int> parameter;
  EXPECT_FALSE(parameter.CheckValueTypeAndGet(7, Json::intValue, refuseAll));
  EXPECT_TRUE(parameter.IsSet());
  EXPECT_TRUE(parameter.IsInvalid());
  EXPECT_EQ(parameter.Get(), 7);
  EXPECT_EQ(parameter.Get(5), 5);
}

TEST(ParameterValidator, IsAskedWithTheParsedValue) {
  APIParameter<int> parameter;
  EXPECT_TRUE(parameter.CheckValueTypeAndGet(7, Json::intValue, acceptPositive));
  EXPECT_EQ(askedValue, 7);
  EXPECT_FALSE(parameter.IsInvalid());
  EXPECT_EQ(parameter.Get(5), 7);
}

TEST(ParameterValidator, IsNotAskedAboutAWrongType) {
  askedValue = 0;
  APIParameter<int> parameter;
  EXPECT_FALSE(parameter.CheckValueTypeAndGet("7", Json::intValue, acceptPositive));
  EXPECT_EQ(askedValue, 0);
}
