#include <gtest/gtest.h>

#include <string>

#include "tests/unit/model/request/Fixture.h"

using namespace QELO;

namespace {

APIRequest requestWithCookies(const std::string& header) {
  Json::Value init;
  init["environ"]["HTTP_COOKIE"] = header;
  return APIRequest(init);
}

Json::Value cookies(const std::string& header) {
  return requestWithCookies(header).Serialize()["cookie"];
}

}  // namespace

TEST(CookieParsing, DecodesValues) {
  EXPECT_EQ(cookies("a=1;b=x%20y"), json(R"({"a":"1","b":"x y"})"));
  EXPECT_EQ(cookies("a=x+y"), json(R"({"a":"x y"})"));
}

TEST(CookieParsing, SkipsAPieceWithoutAnEqualsSign) {
  EXPECT_EQ(cookies("a=1;alone;b=2"), json(R"({"a":"1","b":"2"})"));
}

TEST(CookieParsing, LastOfTwoEqualNamesWins) {
  EXPECT_EQ(cookies("a=1;a=2"), json(R"({"a":"2"})"));
}

TEST(CookieParsing, StoresAPieceThatStartsWithTheEqualsSignUnderTheEmptyName) {
  const APIRequest request = requestWithCookies("=x;b=2");
  EXPECT_TRUE(request.HasCookie(""));
  EXPECT_EQ(request.GetCookie("", "default"), "x");
  EXPECT_EQ(request.GetCookie("b", "default"), "2");
}

TEST(CookieParsing, StoresAnEmptyValueForAPieceThatEndsWithTheEqualsSign) {
  EXPECT_EQ(cookies("a="), json(R"({"a":""})"));
}

TEST(CookieParsing, SplitsAtTheFirstEqualsSignAndLeavesNamesAsTheyAre) {
  EXPECT_EQ(cookies("a=b=c;%41=1"), json(R"({"a":"b=c","%41":"1"})"));
}

TEST(CookieParsing, DropsBlanksAfterTheSeparator) {
  EXPECT_EQ(cookies("a=1; b=2"), json(R"({"a":"1","b":"2"})"));
}

TEST(CookieParsing, GivesNothingWithoutAHeader) {
  EXPECT_EQ(APIRequest().Serialize()["cookie"], json("{}"));
  EXPECT_EQ(cookies(""), json("{}"));
  EXPECT_EQ(cookies(";;;"), json("{}"));
}

TEST(CookieParsing, IgnoresAHeaderThatIsNoText) {
  APIRequest request;
  request.Serialize()["environ"]["HTTP_COOKIE"] = json("[\"a=1\"]");
  request.InitEnv(json("{}"));
  EXPECT_EQ(request.Serialize()["cookie"], json("{}"));
}

TEST(CookieParsing, KeepsCookiesThatALaterHeaderDoesNotName) {
  APIRequest request = requestWithCookies("a=1;b=1");
  request.InitEnv(json(R"({"HTTP_COOKIE":"b=2"})"));
  EXPECT_EQ(request.Serialize()["cookie"], json(R"({"a":"1","b":"2"})"));
}
