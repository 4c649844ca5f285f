// What a link's owner may do with it, and what the database keeps.

#include "tests/unit/platform/sharing/Fixture.h"

using namespace QELO::sharing;

namespace {

class Links : public SharingLinks {
 protected:
  static LinkResult Create(const std::string& terms) {
    Json::Value link;
    return CreateLink("alice", Parse(terms), link);
  }
  static Json::Value List(const std::string& owner = "alice") {
    Json::Value links;
    EXPECT_EQ(ListLinks(owner, links), LINK_DONE);
    return links;
  }
};

TEST_F(Links, AreMadeWithDefaults) {
  Json::Value link = Make();
  EXPECT_EQ(link["link"].asString().size(), 43U);
  EXPECT_GT(link["created"].asInt64(), 1'600'000'000);
  link.removeMember("link");
  link.removeMember("created");
  EXPECT_EQ(link, Parse(R"({"id": 1, "project": "files", "name": "", "path": "",
      "protect": "session", "hasPassword": false, "matchAddress": true, "upload": false,
      "expires": 0, "maxUses": 0, "uses": 0, "maxBytes": 0})"));
}

TEST_F(Links, KeepWhatTheirOwnerSays) {
  const std::string terms = R"({"name": "Holiday", "path": "/photos", "protect": "owner",
      "matchAddress": false, "upload": true, "expires": 4000000000, "maxUses": 3,
      "maxBytes": 1000000})";
  Make(terms);
  const Json::Value link = List()[0];
  const Json::Value given = Parse(terms);
  for (const std::string& name : given.getMemberNames()) {
    EXPECT_EQ(QELO::JsonHelper::toString(link[name]), QELO::JsonHelper::toString(given[name]));
  }
  EXPECT_FALSE(link.isMember("link"));
}

TEST_F(Links, WithBadTermsAreNotMade) {
  for (const char* terms : {R"({})",
                            R"({"project": ""})",
                            R"({"project": "../x"})",
                            R"({"project": "a/b"})",
                            R"({"project": ".x"})",
                            R"({"project": 5})",
                            R"({"project": "x", "unknown": 1})",
                            R"({"project": "x", "name": 5})",
                            R"({"project": "x", "name": "a\nb"})",
                            R"({"project": "x", "protect": "all"})",
                            R"({"project": "x", "protect": 2})",
                            R"({"project": "x", "expires": -1})",
                            R"({"project": "x", "expires": 1.5})",
                            R"({"project": "x", "maxUses": "3"})",
                            R"({"project": "x", "maxBytes": 1e30})",
                            R"({"project": "x", "upload": 1})",
                            R"({"project": "x", "matchAddress": null})",
                            R"({"project": "x", "password": 5})",
                            R"({"project": "x", "password": null})",
                            R"({"project": "x", "protect": "none", "password": "p"})",
                            R"({"project": "x", "protect": "none", "maxUses": 1})",
                            R"([])",
                            R"("x")"}) {
    EXPECT_EQ(Create(terms), LINK_BAD_TERMS) << terms;
  }
  const std::string longName(129, 'x');
  EXPECT_EQ(Create(R"({"project": "x", "name": ")" + longName + "\"}"), LINK_BAD_TERMS);
  EXPECT_EQ(Create(R"({"project": "x", "password": ")" + longName + "\"}"), LINK_BAD_TERMS);
  EXPECT_EQ(List().size(), 0U);
}

TEST_F(Links, SecretsAreKeptAsHashesAlone) {
  const Json::Value link = Make(R"({"password": "open-sesame"})");
  ASSERT_EQ(Open(link, "open-sesame"), LINK_DONE);
  for (const char* file : {"", "-wal"}) {
    const std::string bytes = Read(kDatabase + std::string(file));
    for (const std::string& secret :
         {link["link"].asString(), visit["sid"].asString(), std::string("open-sesame")}) {
      EXPECT_EQ(bytes.find(secret), std::string::npos);
    }
  }
}

TEST_F(Links, DatabaseIsItsOwnersAlone) {
  Make();
  EXPECT_EQ(Status(kDatabase).st_mode & 07777, 0600U);
  EXPECT_EQ(Status(kDatabase + std::string("-wal")).st_mode & 07777, 0600U);
}

TEST_F(Links, OfOthersAreNeitherListedNorChangedNorRemoved) {
  const Json::Value link = Make();
  EXPECT_EQ(List("bob").size(), 0U);
  EXPECT_EQ(Change(link, R"({"name": "mine"})", "bob"), LINK_ABSENT);
  EXPECT_EQ(RemoveLink("bob", link["id"].asInt64()), LINK_ABSENT);
  EXPECT_EQ(List().size(), 1U);
}

TEST_F(Links, ChangeOfOneTermLeavesTheOthers) {
  const Json::Value link = Make(R"({"name": "a", "path": "/p", "password": "pw"})");
  ASSERT_EQ(Change(link, R"({"name": "b"})"), LINK_DONE);
  EXPECT_EQ(changed["path"], "/p");
  EXPECT_EQ(changed["hasPassword"], true);
  EXPECT_EQ(List()[0]["name"], "b");
  EXPECT_EQ(Open(link, "pw"), LINK_DONE);
}

TEST_F(Links, PasswordCanBeTakenAway) {
  const Json::Value link = Make(R"({"password": "pw"})");
  ASSERT_EQ(Change(link, R"({"password": ""})"), LINK_DONE);
  EXPECT_EQ(Open(link), LINK_DONE);
}

TEST_F(Links, BadChangesChangeNothing) {
  const Json::Value link = Make(R"({"password": "pw"})");
  for (const char* terms : {R"({"project": "other"})", R"({"protect": "none"})", R"({"renew": 1})",
                            R"({"name": "b", "uses": 0})", R"({"id": 7})"}) {
    EXPECT_EQ(Change(link, terms), LINK_BAD_TERMS) << terms;
  }
  EXPECT_EQ(List()[0]["name"], "");
}

TEST_F(Links, MissingOnesAreAbsent) {
  EXPECT_EQ(RemoveLink("alice", 1), LINK_ABSENT);
  EXPECT_EQ(ChangeLink("alice", 1, Parse("{}"), changed), LINK_ABSENT);
  const Json::Value link = Make();
  EXPECT_EQ(RemoveLink("alice", link["id"].asInt64() + 1), LINK_ABSENT);
  EXPECT_EQ(RemoveLink("alice", link["id"].asInt64()), LINK_DONE);
  EXPECT_EQ(RemoveLink("alice", link["id"].asInt64()), LINK_ABSENT);
}

TEST_F(Links, AreFoundByTheirIdForTheirOwnerAlone) {
  const std::string noSecret = kNoSecret;
  Json::Value found;
  EXPECT_EQ(FindLink("alice", noSecret, found), LINK_ABSENT);  // no database yet
  const Json::Value link = Make(R"({"name": "n"})");
  const std::string id = link["link"].asString();
  ASSERT_EQ(FindLink("alice", id, found), LINK_DONE);
  EXPECT_EQ(found, link);
  found = Json::Value();
  for (const std::string& wrong :
       {noSecret, id.substr(1), id + "x", std::string(), std::string("1")}) {
    EXPECT_EQ(FindLink("alice", wrong, found), LINK_ABSENT) << wrong;
  }
  EXPECT_EQ(FindLink("bob", id, found), LINK_ABSENT);
  EXPECT_EQ(FindLink("zoe", id, found), LINK_FAILED);
  EXPECT_TRUE(found.isNull());
}

TEST_F(Links, NumbersAreNotGivenTwice) {
  const Json::Value link = Make();
  ASSERT_EQ(RemoveLink("alice", link["id"].asInt64()), LINK_DONE);
  EXPECT_NE(Make()["id"], link["id"]);
}

TEST_F(Links, OfOneOwnerAreLimited) {
  Make();
  Execute(
      "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 999)"
      " INSERT INTO links(hash, owner, uid, project, name, path, protect, match_address, upload,"
      " password, created, expires, max_uses, uses, max_bytes)"
      " SELECT i, owner, uid, project, name, path, protect, match_address, upload, password,"
      " created, expires, max_uses, uses, max_bytes FROM links, n WHERE id = 1");
  EXPECT_EQ(List().size(), 1000U);
  EXPECT_EQ(Create(R"({"project": "files"})"), LINK_TOO_MANY);
  Make("{}", "admin");
}

TEST_F(Links, OfAnUnknownOwnerAreNotMade) {
  Json::Value link;
  EXPECT_EQ(CreateLink("zoe", Parse(R"({"project": "files"})"), link), LINK_FAILED);
}

}  // namespace
