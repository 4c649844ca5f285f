// CheckSharingPermission: who may call by a link, and what the client is told.

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

using LinkPermission = Links;

TEST_F(LinkPermission, RequestWithoutALinkIs126) {
  Describe("{}", kUnchecked);
  MakeRequest("");
  EXPECT_EQ(Check(), "refused 126 -4");
  EXPECT_EQ(Calls("QeloSharingIsAuthorized"), 0);
}

TEST_F(LinkPermission, MethodThatDoesNotAllowSharingIs126AndTheLinkIsNotLookedAt) {
  Describe("{}", R"({"skipSharingAppCheck": true})");
  MakeRequest();
  entry->Request()->SetAuthResult(AUTHORIZED_YES);
  EXPECT_EQ(Check(), "refused 126 -4");
  EXPECT_EQ(Calls("QeloSharingIsAuthorized"), 0);
}

TEST_F(LinkPermission, EachResultHasItsCodeAndIsStored) {
  Describe("{}", kUnchecked);
  const std::pair<int, const char*> rows[] = {
      {-8, "refused 150 -8"}, {-7, "refused 123 -7"}, {-6, "refused 124 -6"},
      {-5, "refused 122 -5"}, {-4, "refused 101 -7"}, {-3, "refused 101 -7"},
      {-2, "refused 126 -2"}, {-1, "refused 125 -1"}, {0, "refused 101 -7"},
      {2, "refused 101 -7"},  {-9, "refused 101 -7"}, {1, "passed 0 1"}};
  for (const auto& [result, expected] : rows) {
    entry = std::make_unique<LinkEntry<WebEntry>>();
    platform->sharingAuthorized = result;
    MakeRequest();
    EXPECT_EQ(Check(), expected) << result;
  }
}

TEST_F(LinkPermission, RefusalIsLoggedWithItsReason) {
  Describe("{}", kUnchecked);
  platform->sharingAuthorized = -1;
  MakeRequest();
  Check();
  EXPECT_EQ(SyslogCapture::Count("call refused from 192.0.2.7: the sharing session has timed out;"
                                 " account []"),
            1);
}

TEST_F(LinkPermission, PlatformIsAskedForLinkSessionAddressAndSizeOfTheBody) {
  Describe("{}", kUnchecked);
  contentLength = "12";
  MakeRequest();
  Check();
  EXPECT_EQ(platform->calls.back(), "QeloSharingIsAuthorized(link, visitor, 192.0.2.7, 12)");
}

TEST_F(LinkPermission, EmptySessionIsHandedOnAsNull) {
  Describe("{}", kUnchecked);
  MakeRequest("link", "");
  Check();
  EXPECT_EQ(platform->calls.back(), "QeloSharingIsAuthorized(link, (null), 192.0.2.7, 0)");
}

TEST_F(LinkPermission, LengthThatIsNoneCountsAsLongerThanAnyLimit) {
  Describe("{}", kUnchecked);
  for (const char* length : {"-1", "5x", "99999999999999999999"}) {
    contentLength = length;
    MakeRequest();
    Check();
    EXPECT_EQ(platform->calls.back(),
              "QeloSharingIsAuthorized(link, visitor, 192.0.2.7, 9223372036854775807)");
  }
}

TEST_F(LinkPermission, CallThatTheApplicationRefusesIs127) {
  Install("link_checks");
  Describe("{}", kByLink);
  MakeRequest("link", "visitor", R"({"check": "refuse"})");
  EXPECT_EQ(Check(), "refused 127 -4");
}

TEST_F(LinkPermission, CallThatTheApplicationAllowsPasses) {
  Install("link_checks");
  Describe("{}", kByLink);
  MakeRequest("link", "visitor", R"({"check": "allow"})");
  EXPECT_EQ(Check(), "passed 0 1");
}

TEST_F(LinkPermission, ApplicationWithoutALibraryIs127) {
  Describe("{}", kByLink);
  MakeRequest();
  EXPECT_EQ(Check(), "refused 127 -4");
}

TEST_F(LinkPermission, SkippedApplicationCheckOpensNoLibrary) {
  Describe("{}", kUnchecked);
  MakeRequest();
  EXPECT_EQ(Check(), "passed 0 1");
  EXPECT_EQ(SyslogCapture::Count("cannot open library"), 0);
  EXPECT_EQ(Calls("InitCredentialsByExecutable"), 0);
}

TEST_F(LinkPermission, ApplicationIsNotAskedAboutAVisitorWhoMayNotComeIn) {
  Install("link_checks");
  Describe("{}", kByLink);
  platform->sharingAuthorized = -5;
  MakeRequest();
  EXPECT_EQ(Check(), "refused 122 -5");
  EXPECT_FALSE(entry->Request()->HasAttr("asked"));
}

TEST_F(LinkPermission, ProtectionInTheOwnersNameMakesTheOwnerTheCaller) {
  Describe("{}", kUnchecked);
  link.protectType = sharing::SHARING_PROTECT_OWNER;
  MakeRequest();
  EXPECT_EQ(Check(), "passed 0 1");
  EXPECT_EQ(entry->Request()->GetLoginUserName(), "ann");
  EXPECT_TRUE(entry->Request()->IsAuthorized());
}

TEST_F(LinkPermission, OtherProtectionsMakeNobodyTheCaller) {
  Describe("{}", kUnchecked);
  for (const int type : {sharing::SHARING_PROTECT_NONE, sharing::SHARING_PROTECT_SESSION}) {
    link.protectType = type;
    MakeRequest();
    EXPECT_EQ(Check(), "passed 0 1");
    EXPECT_EQ(entry->Request()->GetLoginUserName(), "");
    EXPECT_FALSE(entry->Request()->IsAuthorized());
    EXPECT_EQ(Calls("QELOUserGetByUID"), 0);
  }
}

TEST_F(LinkPermission, NothingOfALoginStaysWithACallByALink) {
  Describe("{}", kUnchecked);
  Set("QELO_WEBAPI_USERNAME", "bob");
  MakeRequest();
  entry->Request()->InitSession(Parse(R"({"username": "bob", "isAuthorized": true})"));
  for (const int result : {1, -5}) {
    platform->sharingAuthorized = result;
    Check();
    EXPECT_EQ(entry->Request()->GetLoginUserName(), "");
    EXPECT_FALSE(entry->Request()->IsAuthorized());
    EXPECT_EQ(entry->Request()->GetSessionID(), "");
    EXPECT_EQ(Environment("QELO_WEBAPI_USERNAME"), "(unset)");
  }
}

TEST_F(LinkPermission, NullArgumentsAreRefused) {
  Describe("{}", kUnchecked);
  MakeRequest();
  EXPECT_FALSE(entry->CheckSharingPermission(nullptr, entry->Response()));
  EXPECT_FALSE(entry->CheckSharingPermission(entry->Request(), nullptr));
}

TEST_F(LinkPermission, CallByALinkRunsForTheOwner) {
  Describe("{}", R"({"allowSharing": true, "skipSharingAppCheck": true, "grantByDefault": true})");
  link.protectType = sharing::SHARING_PROTECT_OWNER;
  platform->sharingEntry = sharing::record::Entry(link);
  platform->sharingSession = session;
  Get("api=QELO.Test.Good&version=1&method=whoami&_sharing_id=S&_sharing_sid=T");
  const Json::Value data = Serve().Json()["data"];
  EXPECT_EQ(data["user"], "ann");
  EXPECT_EQ(data["authResult"], 1);
}

}  // namespace
}  // namespace QELO
