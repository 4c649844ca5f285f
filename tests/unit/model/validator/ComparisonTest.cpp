#include <gtest/gtest.h>

#include <cfloat>
#include <cmath>
#include <limits>
#include <string>

#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIValidator.h"

using namespace QELO;

namespace {

template <typename T>
APIParameter<T> parameter(const T& value) {
  APIParameter<T> made;
  made.SetDefault(value);
  return made;
}

template <typename T>
APIParameter<T> invalid(const T& value) {
  APIParameter<T> made = parameter(value);
  made.MarkInvalid();
  return made;
}

template <typename T>
class IntegerComparison : public testing::Test {};

using Integers = testing::Types<int, long long, unsigned int, unsigned long long>;
TYPED_TEST_SUITE(IntegerComparison, Integers);

}  // namespace

TYPED_TEST(IntegerComparison, BetweenIncludesBothBounds) {
  for (const TypeParam value : {5, 7, 10}) {
    EXPECT_TRUE(APIValidator::IsBetween(parameter<TypeParam>(value), 5, 10)) << value;
  }
  for (const TypeParam value : {0, 4, 11}) {
    EXPECT_FALSE(APIValidator::IsBetween(parameter<TypeParam>(value), 5, 10)) << value;
  }
  EXPECT_FALSE(APIValidator::IsBetween(parameter<TypeParam>(5), 6, 4));
}

TYPED_TEST(IntegerComparison, GreaterAndLessAreStrict) {
  EXPECT_FALSE(APIValidator::IsGreater(parameter<TypeParam>(5), 5));
  EXPECT_TRUE(APIValidator::IsGreater(parameter<TypeParam>(6), 5));
  EXPECT_FALSE(APIValidator::IsLess(parameter<TypeParam>(5), 5));
  EXPECT_TRUE(APIValidator::IsLess(parameter<TypeParam>(4), 5));
}

TYPED_TEST(IntegerComparison, HoldsAtTheEndsOfTheType) {
  constexpr TypeParam kMin = std::numeric_limits<TypeParam>::min();
  constexpr TypeParam kMax = std::numeric_limits<TypeParam>::max();
  EXPECT_TRUE(APIValidator::IsBetween(parameter(kMin), kMin, kMax));
  EXPECT_TRUE(APIValidator::IsBetween(parameter(kMax), kMin, kMax));
  EXPECT_TRUE(APIValidator::IsGreater(parameter(kMax), kMin));
  EXPECT_TRUE(APIValidator::IsLess(parameter(kMin), kMax));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(kMin), kMax));
}

TYPED_TEST(IntegerComparison, EqualIsEqual) {
  EXPECT_TRUE(APIValidator::IsEqual(parameter<TypeParam>(5), 5));
  EXPECT_FALSE(APIValidator::IsEqual(parameter<TypeParam>(5), 6));
}

TYPED_TEST(IntegerComparison, RefusesWhatIsUnsetOrInvalid) {
  for (const APIParameter<TypeParam>& none : {APIParameter<TypeParam>(), invalid<TypeParam>(0)}) {
    EXPECT_FALSE(APIValidator::IsEqual(none, 0));
    EXPECT_FALSE(APIValidator::IsBetween(none, 0, 1));
    EXPECT_FALSE(APIValidator::IsLess(none, 1));
  }
  EXPECT_FALSE(APIValidator::IsGreater(invalid<TypeParam>(2), 1));
}

TYPED_TEST(IntegerComparison, TakesNullAsZero) {
  APIParameter<TypeParam> null;
  EXPECT_TRUE(null.CheckValueTypeAndGet(Json::Value(), Json::intValue, nullptr));
  EXPECT_TRUE(APIValidator::IsEqual(null, 0));
}

TEST(RealComparison, EqualHasATolerance) {
  EXPECT_TRUE(APIValidator::IsEqual(parameter(0.1 + 0.2), 0.3));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(1.0), 1.0 + 1e-15));
  EXPECT_TRUE(APIValidator::IsEqual(parameter(DBL_EPSILON), 0.0));
  EXPECT_TRUE(APIValidator::IsEqual(parameter(-DBL_EPSILON), 0.0));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(std::nextafter(DBL_EPSILON, 1.0)), 0.0));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(-std::nextafter(DBL_EPSILON, 1.0)), 0.0));
  EXPECT_TRUE(APIValidator::IsEqual(parameter(5.0), 5));
}

TEST(RealComparison, GreaterAndLessMeanByMoreThanTheTolerance) {
  EXPECT_FALSE(APIValidator::IsGreater(parameter(5.0), 5.0));
  EXPECT_FALSE(APIValidator::IsGreater(parameter(DBL_EPSILON), 0.0));
  EXPECT_TRUE(APIValidator::IsGreater(parameter(std::nextafter(DBL_EPSILON, 1.0)), 0.0));
  EXPECT_FALSE(APIValidator::IsLess(parameter(5.0), 5.0));
  EXPECT_FALSE(APIValidator::IsLess(parameter(-DBL_EPSILON), 0.0));
  EXPECT_TRUE(APIValidator::IsLess(parameter(-std::nextafter(DBL_EPSILON, 1.0)), 0.0));
}

TEST(RealComparison, BetweenExcludesBothBounds) {
  EXPECT_FALSE(APIValidator::IsBetween(parameter(5.0), 5.0, 10.0));
  EXPECT_FALSE(APIValidator::IsBetween(parameter(10.0), 5.0, 10.0));
  EXPECT_TRUE(APIValidator::IsBetween(parameter(7.5), 5.0, 10.0));
  EXPECT_FALSE(APIValidator::IsBetween(parameter(DBL_EPSILON), 0.0, 1.0));
  EXPECT_FALSE(APIValidator::IsBetween(parameter(4.0), 5.0, 10.0));
  EXPECT_FALSE(APIValidator::IsBetween(parameter(11.0), 5.0, 10.0));
}

TEST(RealComparison, RefusesWhatIsNoNumberUnsetOrInvalid) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  for (const APIParameter<double>& none : {APIParameter<double>(), invalid(0.0), parameter(nan)}) {
    EXPECT_FALSE(APIValidator::IsEqual(none, 0.0));
    EXPECT_FALSE(APIValidator::IsBetween(none, -1.0, 1.0));
    EXPECT_FALSE(APIValidator::IsGreater(none, -1.0));
    EXPECT_FALSE(APIValidator::IsLess(none, 1.0));
  }
}

TEST(TextComparison, EqualComparesAllBytes) {
  const std::string withNul("a\0b", 3);
  EXPECT_TRUE(APIValidator::IsEqual(parameter<std::string>("ab"), "ab"));
  EXPECT_TRUE(APIValidator::IsEqual(parameter<std::string>("ab"), std::string("ab")));
  EXPECT_TRUE(APIValidator::IsEqual(parameter(withNul), withNul));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(withNul), "a"));
  EXPECT_FALSE(APIValidator::IsEqual(parameter<std::string>("AB"), "ab"));
  EXPECT_TRUE(APIValidator::IsEqual(parameter<std::string>(""), ""));
}

TEST(TextComparison, RefusesWhatIsUnsetInvalidOrNoText) {
  const char* nothing = nullptr;
  EXPECT_FALSE(APIValidator::IsEqual(parameter<std::string>(""), nothing));
  EXPECT_FALSE(APIValidator::IsEqual(APIParameter<std::string>(), ""));
  EXPECT_FALSE(APIValidator::IsEqual(APIParameter<std::string>(), std::string()));
  EXPECT_FALSE(APIValidator::IsEqual(invalid<std::string>("a"), "a"));
  EXPECT_FALSE(APIValidator::IsEqual(invalid<std::string>("a"), std::string("a")));
}

TEST(TruthComparison, EqualIsEqual) {
  EXPECT_TRUE(APIValidator::IsEqual(parameter(true), true));
  EXPECT_TRUE(APIValidator::IsEqual(parameter(false), false));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(true), false));
  EXPECT_FALSE(APIValidator::IsEqual(APIParameter<bool>(), false));
  EXPECT_FALSE(APIValidator::IsEqual(invalid(true), true));
}

TEST(JsonComparison, EqualComparesTypeAndValue) {
  EXPECT_TRUE(APIValidator::IsEqual(parameter(json(R"({"a":[1,"x"]})")), json(R"({"a":[1,"x"]})")));
  EXPECT_FALSE(APIValidator::IsEqual(parameter(json("[1]")), json("[\"1\"]")));
  EXPECT_FALSE(APIValidator::IsEqual(APIParameter<Json::Value>(), Json::Value()));
  EXPECT_FALSE(APIValidator::IsEqual(invalid(json("[1]")), json("[1]")));
}

TEST(Belonging, IsToAnElementOfAList) {
  const Json::Value list = json(R"(["a", "", 5, ["b"]])");
  for (const char* text : {"a", ""}) {
    EXPECT_TRUE(APIValidator::IsBelong(parameter<std::string>(text), list)) << text;
    EXPECT_TRUE(APIValidator::IsBelong(parameter(Json::Value(text)), list)) << text;
  }
  for (const char* text : {"b", "A", "5"}) {
    EXPECT_FALSE(APIValidator::IsBelong(parameter<std::string>(text), list)) << text;
  }
  EXPECT_TRUE(APIValidator::IsBelong(parameter(json("5")), list));
  EXPECT_TRUE(APIValidator::IsBelong(parameter(json("[\"b\"]")), list));
  EXPECT_FALSE(APIValidator::IsBelong(parameter(json("6")), list));
}

TEST(Belonging, IsToNothingButAList) {
  for (const char* text : {"[]", "null", "\"a\"", "{\"a\":\"a\"}", "5"}) {
    EXPECT_FALSE(APIValidator::IsBelong(parameter<std::string>("a"), json(text))) << text;
    EXPECT_FALSE(APIValidator::IsBelong(parameter(Json::Value("a")), json(text))) << text;
  }
}

TEST(Belonging, IsNotOfWhatIsUnsetOrInvalid) {
  const Json::Value list = json(R"(["", null, "a"])");
  EXPECT_FALSE(APIValidator::IsBelong(APIParameter<std::string>(), list));
  EXPECT_FALSE(APIValidator::IsBelong(APIParameter<Json::Value>(), list));
  EXPECT_FALSE(APIValidator::IsBelong(invalid<std::string>("a"), list));
  EXPECT_FALSE(APIValidator::IsBelong(invalid(Json::Value("a")), list));
}

TEST(ValidatorChecks, ServeTheGettersAsTheyAre) {
  const APIRequest request =
      requestWithParams(R"({"mail": "a@b", "bad": "ab", "port": 80, "far": 70000})");
  EXPECT_FALSE(request.GetAndCheckString("mail", APIRequest::PARAM_REQUIRED, APIValidator::IsEMail)
                   .IsInvalid());
  EXPECT_TRUE(request.GetAndCheckString("bad", APIRequest::PARAM_REQUIRED, APIValidator::IsEMail)
                  .IsInvalid());
  EXPECT_FALSE(
      request.GetAndCheckInt("port", APIRequest::PARAM_REQUIRED, APIValidator::IsPort).IsInvalid());
  EXPECT_TRUE(
      request.GetAndCheckInt("far", APIRequest::PARAM_REQUIRED, APIValidator::IsPort).IsInvalid());
}
