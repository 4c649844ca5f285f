// QeloSharingIsAuthorized: each of its results.

#include "tests/unit/platform/sharing/Fixture.h"

using namespace QELO::sharing;

namespace {

using LinkAuthorization = SharingLinks;

TEST_F(LinkAuthorization, VisitorsSessionMayComeIn) {
  const Json::Value link = Make();
  EXPECT_EQ(Ask(link, SessionFor(link)), 1);
}

TEST_F(LinkAuthorization, AddressMatchBindsTheSessionToItsAddress) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  EXPECT_EQ(Ask(link, sid, kOther), -8);
  EXPECT_EQ(Ask(link, sid, ""), -8);
  EXPECT_EQ(Ask(link, sid, "::ffff:192.0.2.7"), 1);
}

TEST_F(LinkAuthorization, WithoutAddressMatchAnyAddressWillDo) {
  const Json::Value link = Make(R"({"matchAddress": false})");
  EXPECT_EQ(Ask(link, SessionFor(link), kOther), 1);
}

TEST_F(LinkAuthorization, SessionOfAnotherLinkIsMinus7) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  EXPECT_EQ(Ask(Make(), sid), -7);
  EXPECT_EQ(Ask(Make("{}", "bob"), sid), -7);
}

TEST_F(LinkAuthorization, SessionBeforeAChangeOfThePasswordIsMinus7) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  ASSERT_EQ(Change(link, R"({"password": "new"})"), LINK_DONE);
  EXPECT_EQ(Ask(link, sid), -7);
}

TEST_F(LinkAuthorization, ExpiredLinkIsMinus6) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  ASSERT_EQ(Change(link, R"({"expires": 1})"), LINK_DONE);
  EXPECT_EQ(Ask(link, sid), -6);
  EXPECT_EQ(Ask(link, ""), -6);
}

TEST_F(LinkAuthorization, LinkOfAnOwnerWhoMayNotLogInIsMinus6) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  SetShadow("alice", "!$6$locked$x:19000:0:99999:7:::");
  EXPECT_EQ(Ask(link, sid), -6);
  SetAccount("alice", "");
  EXPECT_EQ(Ask(link, sid), -6);
}

TEST_F(LinkAuthorization, OwnerOfTheSameNameWithAnotherIdIsMinus6) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  SetAccount("alice", "alice:x:4321:4321::/home/alice:/bin/sh");
  EXPECT_EQ(Ask(link, sid), -6);
}

TEST_F(LinkAuthorization, LargerBodyThanTheLinkTakesIsMinus6) {
  const Json::Value link = Make(R"({"maxBytes": 100})");
  const std::string sid = SessionFor(link);
  EXPECT_EQ(Ask(link, sid, kAddress, 100), 1);
  EXPECT_EQ(Ask(link, sid, kAddress, 101), -6);
}

TEST_F(LinkAuthorization, UsedUpLinkServesThoseWhoHaveOpenedIt) {
  const Json::Value link = Make(R"({"maxUses": 1})");
  const std::string sid = SessionFor(link);
  EXPECT_EQ(Open(link), LINK_REFUSED);
  EXPECT_EQ(Ask(link, sid), 1);
}

TEST_F(LinkAuthorization, LinkWithoutASessionIsMinus5) {
  const Json::Value link = Make();
  EXPECT_EQ(Ask(link, ""), -5);
  EXPECT_EQ(Ask(link, kNoSecret), -5);
}

TEST_F(LinkAuthorization, LinkThatNeedsNoneAsksForNone) {
  const Json::Value link = Make(R"({"protect": "none"})");
  EXPECT_EQ(Ask(link, ""), 1);
  EXPECT_EQ(Ask(link, kNoSecret, kOther), 1);
}

TEST_F(LinkAuthorization, MalformedIdIsMinus4) {
  Json::Value link = Make();
  const std::string sid = SessionFor(link);
  for (const std::string& bad :
       {sid.substr(1), sid + "A", std::string(43, '.'), std::string("x")}) {
    EXPECT_EQ(Ask(link, bad), -4) << bad;
    Json::Value other;
    other["link"] = bad;
    EXPECT_EQ(Ask(other, sid), -4) << bad;
  }
}

TEST_F(LinkAuthorization, DatabaseThatCannotBeAskedIsMinus3AndLogged) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("PRAGMA wal_checkpoint(TRUNCATE)");
  Write(kDatabase, "this is no database at all, however long it may be");
  EXPECT_EQ(Ask(link, sid), -3);
  EXPECT_EQ(SyslogCapture::Count("cannot open the sharing links [file is not a database]"), 1);
  ASSERT_EQ(chmod(Path(kDatabase).c_str(), 0602), 0);
  EXPECT_EQ(Ask(link, sid), -3);
  EXPECT_EQ(SyslogCapture::Count("[others may write it or its directory]"), 1);
}

TEST_F(LinkAuthorization, TableThatIsGoneIsMinus3AndLogged) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("DROP TABLE tokens");
  EXPECT_EQ(Ask(link, sid), -3);
  EXPECT_EQ(SyslogCapture::Count("cannot ask for a sharing link [no such table: tokens]"), 1);
}

TEST_F(LinkAuthorization, UnknownLinkIsMinus2) {
  Json::Value link;
  link["link"] = kNoSecret;
  EXPECT_EQ(Ask(link, ""), -2);
  Make();
  EXPECT_EQ(Ask(link, ""), -2);
  const QeloSharingVisit call{kAddress, 0};
  EXPECT_EQ(QeloSharingIsAuthorized(nullptr, nullptr, &call), -2);
}

TEST_F(LinkAuthorization, RemovedAndRenewedLinksAreMinus2) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  ASSERT_EQ(Change(link, R"({"renew": true})"), LINK_DONE);
  EXPECT_EQ(Ask(link, sid), -2);
  EXPECT_EQ(Ask(changed, sid), -7);
  ASSERT_EQ(RemoveLink("alice", link["id"].asInt64()), LINK_DONE);
  EXPECT_EQ(Ask(changed, ""), -2);
}

TEST_F(LinkAuthorization, SessionPastItsEndIsMinus1) {
  Set({{"sharing_timeout", "5"}});
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("UPDATE sessions SET ends = ends - 5");
  EXPECT_EQ(Ask(link, sid), -1);
}

TEST_F(LinkAuthorization, UseExtendsASessionThatIsHalfOver) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("UPDATE sessions SET ends = ends - 2000");
  EXPECT_EQ(Ask(link, sid), 1);
  Execute("UPDATE sessions SET ends = ends - 2000");
  EXPECT_EQ(Ask(link, sid), 1);
  EXPECT_EQ(Ask(link, sid), 1);
}

TEST_F(LinkAuthorization, UseDoesNotWriteBeforeThat) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("UPDATE sessions SET ends = ends - 1700");
  EXPECT_EQ(Ask(link, sid), 1);
  Execute("UPDATE sessions SET ends = ends - 1900");
  EXPECT_EQ(Ask(link, sid), -1);
}

}  // namespace
