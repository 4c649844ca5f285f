// Opening a link.

#include "tests/unit/platform/sharing/Fixture.h"

using namespace QELO::sharing;

namespace {

using Visits = SharingLinks;

TEST_F(Visits, TellWhatIsShared) {
  const Json::Value link = Make(R"({"path": "/p", "upload": true})");
  ASSERT_EQ(Open(link), LINK_DONE);
  EXPECT_EQ(visit["sid"].asString().size(), 43U);
  EXPECT_EQ(visit["seconds"], 3600);
  EXPECT_EQ(visit["project"], "files");
  EXPECT_EQ(visit["path"], "/p");
  EXPECT_EQ(visit["upload"], true);
}

TEST_F(Visits, OfUnknownLinksAreAbsent) {
  Json::Value link;
  for (const std::string& id : {std::string(kNoSecret), std::string("x"), std::string()}) {
    link["link"] = id;
    EXPECT_EQ(Open(link), LINK_ABSENT);
  }
  Make();
  link["link"] = kNoSecret;
  EXPECT_EQ(Open(link), LINK_ABSENT);
}

TEST_F(Visits, NeedTheRightPassword) {
  const Json::Value link = Make(R"({"password": "open-sesame"})");
  for (const std::string& wrong :
       {std::string(), std::string("open-sesam"), std::string("open-sesame\0x", 13)}) {
    EXPECT_EQ(Open(link, wrong), LINK_WRONG_PASSWORD) << wrong;
    EXPECT_TRUE(visit.isNull());
  }
  EXPECT_EQ(Open(link, "open-sesame"), LINK_DONE);
}

TEST_F(Visits, PasswordsGuessedFastHaveToWait) {
  const Json::Value link = Make(R"({"password": "open-sesame"})");
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(Open(link, "guess"), LINK_WRONG_PASSWORD);
  }
  EXPECT_EQ(Open(link, "open-sesame"), LINK_WAIT);
  EXPECT_GT(visit["retryAfter"].asInt(), 0);
  EXPECT_EQ(Open(link, "open-sesame", kOther), LINK_DONE);
}

TEST_F(Visits, RightPasswordForgetsTheWrongOnes) {
  const Json::Value link = Make(R"({"password": "open-sesame"})");
  for (int i = 0; i < 4; ++i) {
    EXPECT_EQ(Open(link, "guess"), LINK_WRONG_PASSWORD);
  }
  EXPECT_EQ(Open(link, "open-sesame"), LINK_DONE);
  EXPECT_EQ(Open(link, "guess"), LINK_WRONG_PASSWORD);
  EXPECT_EQ(Open(link, "open-sesame"), LINK_DONE);
}

TEST_F(Visits, AreCounted) {
  const Json::Value link = Make(R"({"maxUses": 2})");
  EXPECT_EQ(Open(link), LINK_DONE);
  EXPECT_EQ(Open(link), LINK_DONE);
  EXPECT_EQ(Open(link), LINK_REFUSED);
  Json::Value links;
  ListLinks("alice", links);
  EXPECT_EQ(links[0]["uses"], 2);
}

TEST_F(Visits, WrongPasswordIsNoUse) {
  const Json::Value link = Make(R"({"maxUses": 1, "password": "open-sesame"})");
  EXPECT_EQ(Open(link, "guess"), LINK_WRONG_PASSWORD);
  EXPECT_EQ(Open(link, "open-sesame"), LINK_DONE);
}

TEST_F(Visits, OfExpiredLinksOrGoneOwnersAreRefused) {
  EXPECT_EQ(Open(Make(R"({"expires": 1})")), LINK_REFUSED);
  const Json::Value link = Make();
  SetAccount("alice", "");
  EXPECT_EQ(Open(link), LINK_REFUSED);
}

TEST_F(Visits, OfOneAddressMakeItsOldestGo) {
  const Json::Value link = Make();
  const std::string others = SessionFor(link, kOther);
  const std::string first = SessionFor(link);
  const std::string second = SessionFor(link);
  for (int i = 2; i < 33; ++i) {
    SessionFor(link);
  }
  EXPECT_EQ(Ask(link, first), -5);
  EXPECT_EQ(Ask(link, second), 1);
  EXPECT_EQ(Ask(link, others, kOther), 1);
}

TEST_F(Visits, OfAllAddressesAreLimited) {
  const Json::Value link = Make();
  SessionFor(link);
  Execute(
      "WITH RECURSIVE n(i) AS (SELECT 2 UNION ALL SELECT i + 1 FROM n WHERE i < 4096)"
      " INSERT INTO sessions(id, hash, uid, address, ends) SELECT i, i, uid, 'x', ends"
      " FROM sessions, n WHERE id = 1;"
      "WITH RECURSIVE n(i) AS (SELECT 2 UNION ALL SELECT i + 1 FROM n WHERE i < 4096)"
      " INSERT INTO tokens(session, link, opened) SELECT i, 1, 1 FROM n");
  EXPECT_EQ(Open(link), LINK_REFUSED);
}

TEST_F(Visits, OfLongAgoAreForgotten) {
  const Json::Value link = Make();
  const std::string sid = SessionFor(link);
  Execute("UPDATE sessions SET ends = ends - 90010");
  EXPECT_EQ(Ask(link, sid), -1);
  SessionFor(link);
  EXPECT_EQ(Ask(link, sid), -5);
}

TEST_F(Visits, SessionsLastAsTheSettingSays) {
  Set({{"sharing_timeout", "120"}});
  ASSERT_EQ(Open(Make()), LINK_DONE);
  EXPECT_EQ(visit["seconds"], 120);
}

}  // namespace
