#include <gtest/gtest.h>

#include <string>

#include "tests/unit/model/request/Fixture.h"

using namespace QELO;

namespace {

constexpr APIRequest::PARAM_NECESSITY kOptional = APIRequest::PARAM_OPTIONAL;

bool isShort(const std::string& text) {
  return text.size() < 3;
}
bool isEven(const long long& value) {
  return value % 2 == 0;
}
bool isZero(const int& value) {
  return value == 0;
}
bool isFalse(const bool& value) {
  return !value;
}
bool isNegative(const double& value) {
  return value < 0;
}
bool hasTwo(const Json::Value& value) {
  return value.size() == 2;
}

}  // namespace

TEST(RequestParameter, OptionalAndMissingHasNoFlag) {
  const APIRequest request;
  const APIParameter<int> parameter = request.GetAndCheckInt("n", kOptional);
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_FALSE(parameter.IsInvalid());
  EXPECT_EQ(parameter.Get(5), 5);
}

TEST(RequestParameter, RequiredAndMissingIsInvalidAndTakesNoDefault) {
  const APIRequest request;
  APIParameter<int> parameter = request.GetAndCheckInt("n");
  EXPECT_FALSE(parameter.IsSet());
  EXPECT_TRUE(parameter.IsInvalid());
  EXPECT_FALSE(parameter.SetDefault(5));
  EXPECT_EQ(parameter.Get(5), 5);
  EXPECT_EQ(parameter.Get(), 0);
}

TEST(RequestParameter, RequiredAndMissingIsInvalidForEveryGetter) {
  const APIRequest request;
  EXPECT_TRUE(request.GetAndCheckBool("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckReal("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckString("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckArray("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckObject("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckUnitArray("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckIntegral<long long>("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckIntegral<unsigned int>("n").IsInvalid());
  EXPECT_TRUE(request.GetAndCheckIntegral<unsigned long long>("n").IsInvalid());
}

TEST(RequestParameter, OptionalAndMissingIsUnsetForEveryGetter) {
  const APIRequest request;
  EXPECT_FALSE(request.GetAndCheckBool("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckReal("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckString("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckArray("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckObject("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckUnitArray("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckUnitArray("n", kOptional).IsSet());
  EXPECT_FALSE(request.GetAndCheckIntegral<long long>("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckIntegral<unsigned int>("n", kOptional).IsInvalid());
  EXPECT_FALSE(request.GetAndCheckIntegral<unsigned long long>("n", kOptional).IsInvalid());
}

TEST(RequestParameter, AnyNecessityButZeroIsOptional) {
  const APIRequest request;
  EXPECT_FALSE(
      request.GetAndCheckInt("n", static_cast<APIRequest::PARAM_NECESSITY>(7)).IsInvalid());
}

TEST(RequestParameter, IsReadByItsType) {
  const APIRequest request = requestWithParams(
      R"({"i":-3,"b":true,"r":3,"s":"x","a":[1,2],"o":{"k":1},"l":-5000000000,"u":4294967295,
          "ul":18446744073709551615})");
  EXPECT_EQ(request.GetAndCheckInt("i").Get(9), -3);
  EXPECT_EQ(request.GetAndCheckBool("b").Get(false), true);
  EXPECT_EQ(request.GetAndCheckReal("r").Get(9.0), 3.0);
  EXPECT_EQ(request.GetAndCheckString("s").Get("y"), "x");
  EXPECT_EQ(request.GetAndCheckArray("a").Get(Json::Value()), json("[1,2]"));
  EXPECT_EQ(request.GetAndCheckObject("o").Get(Json::Value()), json("{\"k\":1}"));
  EXPECT_EQ(request.GetAndCheckIntegral<long long>("l").Get(9), -5000000000);
  EXPECT_EQ(request.GetAndCheckIntegral<unsigned int>("u").Get(9), 4294967295u);
  EXPECT_EQ(request.GetAndCheckIntegral<unsigned long long>("ul").Get(9), 18446744073709551615ull);
}

TEST(RequestParameter, OfAnotherTypeIsInvalidAlsoWhenOptional) {
  const APIRequest request = requestWithParams(R"({"text":"x","one":1,"list":[],"object":{}})");
  EXPECT_TRUE(request.GetAndCheckInt("text", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckBool("one", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckReal("text", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckString("one", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckArray("object", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckObject("list", kOptional).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckIntegral<long long>("object", kOptional).IsInvalid());
}

TEST(RequestParameter, SentAsNullIsResetAndKeepsItsInitialValue) {
  const APIRequest request = requestWithParams(R"({"n":null})");
  APIParameter<int> parameter = request.GetAndCheckInt("n");
  EXPECT_TRUE(parameter.IsSet());
  EXPECT_TRUE(parameter.IsReset());
  EXPECT_FALSE(parameter.IsInvalid());
  EXPECT_EQ(parameter.Get(5), 0);
  EXPECT_TRUE(parameter.SetDefault(5));
  EXPECT_EQ(parameter.Get(), 0);
}

TEST(RequestParameter, IsCheckedByTheValidator) {
  const APIRequest request =
      requestWithParams(R"({"s":"abc","l":3,"a":[1],"o":{"x":1},"i":1,"b":true,"r":0.5})");
  EXPECT_TRUE(request.GetAndCheckInt("i", kOptional, isZero).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckBool("b", kOptional, isFalse).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckReal("r", kOptional, isNegative).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckString("s", kOptional, isShort).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckIntegral<long long>("l", kOptional, isEven).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckArray("a", kOptional, hasTwo).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckObject("o", kOptional, hasTwo).IsInvalid());
  EXPECT_TRUE(request.GetAndCheckUnitArray("a", kOptional, hasTwo).IsInvalid());
}

TEST(RequestUnitArray, WrapsASingleValue) {
  const APIRequest request = requestWithParams(R"({"s":"x","o":{"a":1}})");
  EXPECT_EQ(request.GetAndCheckUnitArray("s").Get(), json("[\"x\"]"));
  EXPECT_EQ(request.GetAndCheckUnitArray("o").Get(), json("[{\"a\":1}]"));
}

TEST(RequestUnitArray, TakesAListUnchanged) {
  const APIRequest request = requestWithParams(R"({"a":["x",["y"]],"e":[]})");
  EXPECT_EQ(request.GetAndCheckUnitArray("a").Get(), json("[\"x\",[\"y\"]]"));
  EXPECT_EQ(request.GetAndCheckUnitArray("e").Get(), json("[]"));
}

TEST(RequestUnitArray, WrapsNullAndIsNeverReset) {
  const APIRequest request = requestWithParams(R"({"n":null})");
  const APIParameter<Json::Value> parameter = request.GetAndCheckUnitArray("n");
  EXPECT_TRUE(parameter.IsSet());
  EXPECT_FALSE(parameter.IsReset());
  EXPECT_EQ(parameter.Get(), json("[null]"));
}

TEST(ParameterFactory, ReadsMembersByTheirType) {
  const Json::Value container = json(
      R"({"i":-3,"b":true,"r":0.5,"s":"x","l":-5000000000,"u":7,"a":[1],"o":{"k":1},"n":null})");
  EXPECT_EQ(APIParameterFactory::FromJson<int>(container, "i").Get(9), -3);
  EXPECT_EQ(APIParameterFactory::FromJson<bool>(container, "b").Get(false), true);
  EXPECT_EQ(APIParameterFactory::FromJson<double>(container, "r").Get(9.0), 0.5);
  EXPECT_EQ(APIParameterFactory::FromJson<std::string>(container, "s").Get("y"), "x");
  EXPECT_EQ(APIParameterFactory::FromJson<long long>(container, "l").Get(9), -5000000000);
  EXPECT_EQ(APIParameterFactory::FromJson<unsigned int>(container, "u").Get(9), 7u);
  EXPECT_EQ(APIParameterFactory::FromJson<unsigned long long>(container, "u").Get(9), 7u);
  EXPECT_EQ(APIParameterFactory::ArrayFromJson(container, "a").Get(), json("[1]"));
  EXPECT_EQ(APIParameterFactory::ObjectFromJson(container, "o").Get(), json("{\"k\":1}"));
  EXPECT_TRUE(APIParameterFactory::FromJson<int>(container, "n").IsReset());
}

TEST(ParameterFactory, ContainerThatIsNoObjectIsInvalidEvenWhenOptional) {
  for (const char* container : {"[]", "[1]", "null", "\"x\"", "1"}) {
    const Json::Value value = json(container);
    EXPECT_TRUE(APIParameterFactory::FromJson<int>(value, "n", PARAM_OPTIONAL).IsInvalid());
    EXPECT_TRUE(APIParameterFactory::ArrayFromJson(value, "n", PARAM_OPTIONAL).IsInvalid());
    EXPECT_TRUE(APIParameterFactory::ObjectFromJson(value, "n", PARAM_OPTIONAL).IsInvalid());
    EXPECT_FALSE(APIParameterFactory::FromJson<int>(value, "n", PARAM_OPTIONAL).IsSet());
  }
}

TEST(ParameterFactory, MissingMemberIsInvalidOnlyWhenRequired) {
  const Json::Value empty(Json::objectValue);
  EXPECT_TRUE(APIParameterFactory::FromJson<int>(empty, "n").IsInvalid());
  EXPECT_TRUE(APIParameterFactory::ArrayFromJson(empty, "n").IsInvalid());
  EXPECT_FALSE(APIParameterFactory::FromJson<int>(empty, "n", PARAM_OPTIONAL).IsInvalid());
  EXPECT_FALSE(APIParameterFactory::FromJson<int>(empty, "n", PARAM_OPTIONAL).IsSet());
  EXPECT_FALSE(APIParameterFactory::ObjectFromJson(empty, "n", PARAM_OPTIONAL).IsInvalid());
}

TEST(ParameterFactory, WrongTypeAndRefusingValidatorMakeInvalid) {
  const Json::Value container = json(R"({"s":"abc","a":[1],"o":{"x":1}})");
  EXPECT_TRUE(APIParameterFactory::FromJson<int>(container, "s").IsInvalid());
  EXPECT_TRUE(APIParameterFactory::ArrayFromJson(container, "o").IsInvalid());
  EXPECT_TRUE(APIParameterFactory::ObjectFromJson(container, "a").IsInvalid());
  EXPECT_TRUE(APIParameterFactory::FromJson<std::string>(container, "s", PARAM_OPTIONAL, isShort)
                  .IsInvalid());
  EXPECT_TRUE(
      APIParameterFactory::ArrayFromJson(container, "a", PARAM_OPTIONAL, hasTwo).IsInvalid());
  EXPECT_TRUE(
      APIParameterFactory::ObjectFromJson(container, "o", PARAM_OPTIONAL, hasTwo).IsInvalid());
}
