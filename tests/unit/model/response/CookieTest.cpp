#include <gtest/gtest.h>

#include <climits>
#include <ctime>
#include <string>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIResponse.h"
#include "webapi/base/LogText.h"

using namespace QELO;

namespace {

constexpr char kDeleted[] = "id=x; path=/; expires=Thu, 01-Jan-1970 00:00:01 GMT";

/// The one cookie line of a request with this "client_time", expiring in so many minutes.
std::string lineFor(const std::string& clientTime, long minutes) {
  APIRequest request = requestWithParams("{\"client_time\":" + clientTime + "}");
  APIResponse response(&request);
  EXPECT_TRUE(response.AddCookie("id", "x", "/", minutes));
  return response.GetCookies()[0].asString();
}

/// The "expires" part's time.
time_t expiryOf(const std::string& line) {
  const std::string mark = "; expires=";
  const size_t start = line.find(mark);
  struct tm parts {};
  const char* end = start == std::string::npos ? nullptr
                                               : strptime(line.c_str() + start + mark.size(),
                                                          "%a, %d-%b-%Y %H:%M:%S GMT", &parts);
  EXPECT_NE(end, nullptr) << line;
  return end != nullptr ? timegm(&parts) : -1;
}

class CookieAdding : public testing::Test {
 protected:
  CookieAdding() { SyslogCapture::Clear(); }
  APIResponse response_{nullptr};
};

}  // namespace

TEST_F(CookieAdding, StoresNameEncodedValueAndPath) {
  EXPECT_TRUE(response_.AddCookie("id", "a b;c=\r\n", "/webapi", 0, "", false, false));
  EXPECT_EQ(response_.GetCookies(), json(R"(["id=a%20b%3Bc%3D%0D%0A; path=/webapi"])"));
}

TEST_F(CookieAdding, StoresASessionCookieWithoutExpiry) {
  EXPECT_TRUE(response_.AddCookie("id", "a b", "/", 0, "", false, true));
  EXPECT_EQ(response_.GetCookies(), json(R"(["id=a%20b; path=/; httponly"])"));
}

TEST_F(CookieAdding, AppendsEveryPartInOrder) {
  EXPECT_TRUE(response_.AddCookie("id", "x", "/", -1, "example.org", true, true));
  EXPECT_EQ(response_.GetCookies()[0].asString(),
            std::string(kDeleted) + "; domain=example.org; secure; httponly");
}

TEST_F(CookieAdding, KeepsTwoCookiesOfOneName) {
  EXPECT_TRUE(response_.AddCookie("id", "1", "/"));
  EXPECT_TRUE(response_.AddCookie("id", "2", "/"));
  EXPECT_EQ(response_.GetCookies(), json(R"(["id=1; path=/","id=2; path=/"])"));
}

TEST_F(CookieAdding, TakesLettersDigitsUnderscoreAndHyphenInNames) {
  EXPECT_TRUE(response_.AddCookie("aZ09_-", "x", "/"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(CookieAdding, RefusesOtherCharactersInNamesWithALogLine) {
  for (const char* name : {"a.b", "a=b", "a b", "a;b", "a\n", "\xC3\xBC"}) {
    SyslogCapture::Clear();
    EXPECT_FALSE(response_.AddCookie(name, "x", "/")) << name;
    ASSERT_EQ(SyslogCapture::Messages().size(), 1u);
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
    EXPECT_EQ(lineAsN(SyslogCapture::Messages()[0].text),
              "APIResponse.cpp(N)AddCookie: key[" + LogText(name) + "] contains invalid character");
  }
  EXPECT_EQ(response_.GetCookies(), json("[]"));
}

TEST_F(CookieAdding, RefusesANameWithANul) {
  EXPECT_FALSE(response_.AddCookie(std::string("a\0", 2), "x", "/"));
}

TEST_F(CookieAdding, RefusesAnEmptyNameOrPathSilently) {
  EXPECT_FALSE(response_.AddCookie("", "x", "/"));
  EXPECT_FALSE(response_.AddCookie("id", "x", ""));
  EXPECT_EQ(response_.GetCookies(), json("[]"));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST(CookieExpiry, DeletesForANegativeTime) {
  EXPECT_EQ(lineFor("1000", -1), kDeleted);
  EXPECT_EQ(lineFor("1000", LONG_MIN), kDeleted);
}

TEST(CookieExpiry, CountsFromTheClientsClock) {
  EXPECT_EQ(lineFor("1000", 2), "id=x; path=/; expires=Thu, 01-Jan-1970 00:18:40 GMT");
  EXPECT_EQ(expiryOf(lineFor("1000", 2)), 1120);
  EXPECT_EQ(expiryOf(lineFor("\"1000\"", 2)), 1120);
}

TEST(CookieExpiry, CountsFromOurClockWithoutTheClients) {
  const time_t before = time(nullptr);
  APIRequest request;
  for (APIRequest* asked : {&request, static_cast<APIRequest*>(nullptr)}) {
    APIResponse response(asked);
    EXPECT_TRUE(response.AddCookie("id", "x", "/", 2));
    const time_t expiry = expiryOf(response.GetCookies()[0].asString());
    EXPECT_GE(expiry, before + 120);
    EXPECT_LE(expiry, time(nullptr) + 120);
  }
}

TEST(CookieExpiry, CountsFromOurClockWhenTheClientsIsNoNumber) {
  const time_t before = time(nullptr);
  for (const char* clientTime : {"\"soon\"", "[1000]", "null", "1e30"}) {
    EXPECT_GE(expiryOf(lineFor(clientTime, 2)), before + 120) << clientTime;
  }
}

TEST(CookieExpiry, StaysWithinWhatADateCanSay) {
  const time_t last = 253402300799;
  EXPECT_EQ(expiryOf(lineFor("1000", LONG_MAX)), last);
  EXPECT_EQ(expiryOf(lineFor("9223372036854775807", 1)), last);
  EXPECT_EQ(expiryOf(lineFor("-9223372036854775808", 1)), 0);
}

TEST(CookieExpiry, IgnoresTheLocalTimeZone) {
  setenv("TZ", "UTC-5", 1);
  tzset();
  EXPECT_EQ(lineFor("1000", 2), "id=x; path=/; expires=Thu, 01-Jan-1970 00:18:40 GMT");
  unsetenv("TZ");
  tzset();
}

TEST_F(CookieAdding, CreatesNoListInARecordWithoutOne) {
  Json::Value record = json(R"({"headers":{}})");
  response_.Deserialize(record);
  EXPECT_FALSE(response_.AddCookie("id", "x", "/"));
  EXPECT_EQ(response_.Serialize(), json(R"({"headers":{}})"));
}
