// Credentials given as parameters, and how they reach cookies and environment.

#include <regex>

#include "tests/support/CgiFixture.h"
#include "tests/unit/entry/FailingSetenv.h"
#include "webapi/platform/Sharing.h"

namespace QELO {
namespace {

class CredentialParameters : public CgiTest {
 protected:
  /// Initialises an entry with this query string and cookie line.
  void Initialize(const std::string& query, const std::string& cookies = "") {
    Get(query);
    if (!cookies.empty()) {
      Set("HTTP_COOKIE", cookies);
    }
    EXPECT_TRUE(entry_.Initialize(Json::Value()));
  }

  std::string RequestCookies() {
    return JsonHelper::asString(entry_.Request()->GetEnv("HTTP_COOKIE"));
  }

  static testing::AssertionResult IsLoggedAsNotSet(const std::string& name,
                                                   const std::string& message) {
    const std::regex expected(R"(WebEntry\.cpp:\d+ cannot set )" + name +
                              R"( \[Cannot allocate memory\])");
    return (std::regex_match(message, expected) ? testing::AssertionSuccess()
                                                : testing::AssertionFailure())
           << message;
  }

  TestEntry entry_;
};

TEST_F(CredentialParameters, NoneLeavesCookieUntouched) {
  Initialize("api=a", "id=OLD; lang=en");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=OLD; lang=en");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "OLD");
  EXPECT_EQ(Environment("HTTP_X_QELO_SHARING"), "(unset)");
  EXPECT_FALSE(entry_.Request()->HasEnv("HTTP_X_QELO_SHARING"));
  EXPECT_EQ(Calls("QeloCgiLoadInCookies"), 1);
}

TEST_F(CredentialParameters, SidTakesThePlaceOfTheSessionCookie) {
  Initialize("_sid=X", "id=OLD; lang=en");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "abandoned=OLD; lang=en; id=X");
  EXPECT_EQ(RequestCookies(), "abandoned=OLD; lang=en; id=X");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "X");
  EXPECT_EQ(entry_.Request()->GetCookie("abandoned"), "OLD");
}

TEST_F(CredentialParameters, SidWithoutCookiesIsTheOnlyCookie) {
  Initialize("_sid=X");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=X");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "X");
}

TEST_F(CredentialParameters, SidWithoutSessionCookieIsAppended) {
  Initialize("_sid=X", "lang=en");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "lang=en; id=X");
}

TEST_F(CredentialParameters, SidRenamesTheFirstMatchBeItInALongerName) {
  Initialize("_sid=X", "userid=7; id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "userabandoned=7; id=OLD; id=X");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "X");
}

TEST_F(CredentialParameters, SidRenamesASharingSessionAppendedBefore) {
  Initialize("_sid=X&_sharing_id=S&_sharing_sid=T", "lang=en");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "lang=en; sharing_sabandoned=T; id=X");
}

TEST_F(CredentialParameters, CookiesAreLoadedAgainOnceRewritten) {
  Initialize("_sid=X", "id=OLD");
  EXPECT_EQ(Calls("QeloCgiLoadInCookies"), 2);
  EXPECT_EQ(platform->loadedCookies, "abandoned=OLD; id=X");
}

TEST_F(CredentialParameters, SidSentAsNullEndsTheSession) {
  Initialize("_sid=null", "id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "abandoned=OLD; id=");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "");
}

TEST_F(CredentialParameters, CredentialWithANulIsAnotherText) {
  Initialize("_sid=X%00Y&_sharing_id=S&_sharing_sid=T%00", "a=1; id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "a=1; abandoned=OLD; sharing_sid=T?; id=X?Y");
  EXPECT_EQ(RequestCookies(), Environment("HTTP_COOKIE"));
}

TEST_F(CredentialParameters, TokenWithANulIsAnotherText) {
  Initialize("tid=T%00");
  EXPECT_EQ(Environment("qeloAccessToken"), "T?");
  EXPECT_STREQ(entry_.Request()->GetQeloAccessTokenID(), "T?");
}

TEST_F(CredentialParameters, SidWinsOverTid) {
  Initialize("_sid=X&tid=T");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=X");
  EXPECT_EQ(Environment("qeloAccessToken"), "(unset)");
  EXPECT_EQ(entry_.Request()->GetQeloAccessTokenID(), nullptr);
}

TEST_F(CredentialParameters, TidBecomesTheAccessToken) {
  Initialize("tid=T", "id=OLD");
  EXPECT_EQ(Environment("qeloAccessToken"), "T");
  EXPECT_STREQ(entry_.Request()->GetQeloAccessTokenID(), "T");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=OLD");
  EXPECT_EQ(RequestCookies(), "id=OLD");
  EXPECT_EQ(Calls("QeloCgiLoadInCookies"), 2);
}

TEST_F(CredentialParameters, TidThatCannotBeExportedStopsWithoutAnError) {
  Get("tid=T");
  const FailingSetenv failing("qeloAccessToken");
  EXPECT_FALSE(entry_.Initialize(Json::Value()));
  EXPECT_EQ(entry_.Response()->GetError(), 0);
  EXPECT_EQ(entry_.Response()->GetBody(), Json::Value(Json::objectValue));
  ASSERT_EQ(SyslogCapture::Messages().size(), 1U);
  EXPECT_TRUE(IsLoggedAsNotSet("qeloAccessToken", SyslogCapture::Messages()[0].text));
}

TEST_F(CredentialParameters, ThatCannotBeExportedStopRatherThanLeaveTheFormerOnes) {
  const std::pair<const char*, const char*> cases[] = {
      {"_sid=X", "HTTP_COOKIE"},
      {"_sharing_id=S&_sharing_sid=T", "HTTP_COOKIE"},
      {"_sharing_id=S&_sharing_sid=T", SZ_X_SHARING_HEADER},
      {"_sharing_id=S&_sid=X", SZ_X_SHARING_HEADER}};
  for (const auto& [query, variable] : cases) {
    SyslogCapture::Clear();
    Get(query);
    Set("HTTP_COOKIE", "id=OLD");
    unsetenv(SZ_X_SHARING_HEADER);
    TestEntry entry;
    const FailingSetenv failing(variable);
    EXPECT_FALSE(entry.Initialize(Json::Value())) << query;
    EXPECT_EQ(entry.Response()->GetError(), 117) << query;
    ASSERT_EQ(SyslogCapture::Messages().size(), 1U) << query;
    EXPECT_EQ(SyslogCapture::Messages()[0].priority, 3);
    EXPECT_TRUE(IsLoggedAsNotSet(variable, SyslogCapture::Messages()[0].text));
  }
}

TEST_F(CredentialParameters, ThatCannotBeExportedCallNothing) {
  Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})");
  Get("api=QELO.Test.Good&version=1&method=echo&_sid=X");
  Set("HTTP_COOKIE", "id=OLD");
  const FailingSetenv failing("HTTP_COOKIE");
  EXPECT_EQ(Serve().Code(), 117);
}

TEST_F(CredentialParameters, ThatAreNumbersCountAsSentAndEmpty) {
  Initialize("_sid=12345", "id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "abandoned=OLD; id=");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "");
}

TEST_F(CredentialParameters, TokenAndSharingIdThatAreNumbersCountAsSentAndEmpty) {
  Set(SZ_X_SHARING_HEADER, "header");
  Initialize("tid=5&_sharing_id=7&_sharing_sid=8", "lang=en");
  EXPECT_EQ(Environment("qeloAccessToken"), "");
  EXPECT_EQ(entry_.Request()->GetQeloAccessTokenID(), nullptr);
  EXPECT_EQ(Environment(SZ_X_SHARING_HEADER), "");
  EXPECT_FALSE(entry_.Request()->IsSharing());
  EXPECT_EQ(Environment("HTTP_COOKIE"), "lang=en; sharing_sid=");
}

TEST_F(CredentialParameters, OneLeavesEmptyTextsWhereThereWasNothing) {
  Initialize("tid=T");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "(unset)");
  EXPECT_EQ(Environment(SZ_X_SHARING_HEADER), "(unset)");
  for (const char* key : {"HTTP_COOKIE", SZ_X_SHARING_HEADER}) {
    EXPECT_TRUE(entry_.Request()->HasEnv(key)) << key;
    EXPECT_EQ(entry_.Request()->GetEnv(key), Json::Value("")) << key;
  }
}

TEST_F(CredentialParameters, SharingSidWithoutSharingIdIsIgnored) {
  Initialize("_sharing_sid=T", "id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=OLD");
  EXPECT_EQ(entry_.Request()->GetSharingSID(), "");
  EXPECT_FALSE(entry_.Request()->IsSharing());
}

TEST_F(CredentialParameters, SharingIdTakesThePlaceOfTheHeader) {
  Set(SZ_X_SHARING_HEADER, "header");
  Initialize("_sharing_id=S");
  EXPECT_EQ(Environment(SZ_X_SHARING_HEADER), "S");
  EXPECT_EQ(entry_.Request()->GetSharingID(), "S");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "(unset)");
}

TEST_F(CredentialParameters, SharingHeaderStaysWhenOnlySidIsGiven) {
  Set(SZ_X_SHARING_HEADER, "header");
  Initialize("_sid=X");
  EXPECT_EQ(Environment(SZ_X_SHARING_HEADER), "header");
  EXPECT_EQ(entry_.Request()->GetSharingID(), "header");
}

TEST_F(CredentialParameters, SharingIdAndSidAddTheCookie) {
  Initialize("_sharing_id=S&_sharing_sid=T", "id=OLD");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=OLD; sharing_sid=T");
  EXPECT_EQ(entry_.Request()->GetSharingSID(), "T");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "OLD");
}

TEST_F(CredentialParameters, SharingIdAndSidWithoutCookiesAreTheOnlyCookie) {
  Initialize("_sharing_id=S&_sharing_sid=T");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "sharing_sid=T");
}

// Only the cookies that came decide on a separator, so these two run together.
TEST_F(CredentialParameters, SharingSidAndSidWithoutCookiesHaveNoSeparator) {
  Initialize("_sharing_id=S&_sharing_sid=T&_sid=X");
  EXPECT_EQ(Environment("HTTP_COOKIE"), "sharing_sid=Tid=X");
  EXPECT_EQ(entry_.Request()->GetSessionID(), "");
}

TEST_F(CredentialParameters, SidInTheBodyCountsAsInTheQuery) {
  Post("_sid=X");
  EXPECT_TRUE(entry_.Initialize(Json::Value()));
  EXPECT_EQ(Environment("HTTP_COOKIE"), "id=X");
}

}  // namespace
}  // namespace QELO
