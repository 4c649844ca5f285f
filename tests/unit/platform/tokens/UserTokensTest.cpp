// Tokens that users make, list and revoke for themselves.

#include <filesystem>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tokens/Fixture.h"
#include "webapi/JsonHelper.h"

namespace {

using UserTokens = TokenTest;

TEST_F(UserTokens, UserMakesListsAndRevokesTheOwn) {
  Json::Value terms;
  terms["name"] = "for a script";
  terms["scopes"][0]["api"] = "QELO.X";
  terms["scopes"][0]["method"] = "get*";
  terms["scopes"][1]["api"] = "QELO.Y.*";
  Json::Value record;
  std::string token;
  ASSERT_EQ(QeloAccessTokenCreate("alice", terms, record, token), QELO_TOKEN_DONE);
  EXPECT_EQ(Grant(token), 1);
  EXPECT_STREQ(user_, "alice");
  EXPECT_EQ(Grant(token, "QELO.Y.Z", "set"), 1);
  EXPECT_EQ(Grant(token, "QELO.Z", "get"), -3);
  EXPECT_EQ(record["expires"].asInt64(), record["created"].asInt64() + 90 * 86400);
  Json::Value list;
  ASSERT_EQ(QeloAccessTokenList("alice", list), QELO_TOKEN_DONE);
  ASSERT_EQ(list.size(), 1U);
  EXPECT_GT(list[0]["used"].asInt64(), 0);
  list[0]["used"] = record["used"];
  EXPECT_EQ(list[0], record);
  EXPECT_EQ(list[0]["scopes"][1]["method"], "*");
  ASSERT_EQ(QeloAccessTokenList("bob", list), QELO_TOKEN_DONE);
  EXPECT_EQ(list.size(), 0U);
  const long long id = record["id"].asInt64();
  EXPECT_EQ(QeloAccessTokenRevoke("bob", id), QELO_TOKEN_NONE);
  EXPECT_EQ(Grant(token), 1);
  EXPECT_EQ(QeloAccessTokenRevoke("alice", id), QELO_TOKEN_DONE);
  EXPECT_EQ(Grant(token), -1);
  EXPECT_EQ(QeloAccessTokenRevoke("alice", id), QELO_TOKEN_NONE);
  EXPECT_EQ(QeloAccessTokenList("zoe", list), QELO_TOKEN_FAILED);
}

TEST_F(UserTokens, UserWithoutTokensHasAnEmptyList) {
  Json::Value list;
  EXPECT_EQ(QeloAccessTokenList("alice", list), QELO_TOKEN_DONE);
  EXPECT_EQ(list, Json::Value(Json::arrayValue));
  EXPECT_EQ(QeloAccessTokenRevoke("alice", 1), QELO_TOKEN_NONE);
  EXPECT_FALSE(std::filesystem::exists(Database()));
}

TEST_F(UserTokens, UserHasAsManyAsTheSettingAllows) {
  Set({{"token_limit", "2"}});
  Json::Value terms;
  terms["name"] = "n";
  terms["scopes"][0]["api"] = "*";
  Json::Value record;
  std::string token;
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(QeloAccessTokenCreate("alice", terms, record, token), QELO_TOKEN_DONE);
  }
  EXPECT_EQ(QeloAccessTokenCreate("alice", terms, record, token), QELO_TOKEN_TOO_MANY);
  EXPECT_EQ(QeloAccessTokenCreate("bob", terms, record, token), QELO_TOKEN_DONE);
  EXPECT_EQ(QeloAccessTokenRevoke("alice", 1), QELO_TOKEN_DONE);
  EXPECT_EQ(QeloAccessTokenCreate("alice", terms, record, token), QELO_TOKEN_DONE);
}

TEST_F(UserTokens, TermsThatAreWrongMakeNoToken) {
  const std::string good = R"("name": "n", "scopes": [{"api": "*"}])";
  for (const std::string& terms :
       {std::string("{}"),
        std::string("[]"),
        std::string(R"({"name": "n"})"),
        std::string(R"({"scopes": [{"api": "*"}]})"),
        std::string(R"({"name": "", "scopes": [{"api": "*"}]})"),
        std::string("{\"name\": \"a\\nb\", \"scopes\": [{\"api\": \"*\"}]}"),
        "{\"name\": \"" + std::string(65, 'n') + R"(", "scopes": [{"api": "*"}]})",
        std::string(R"({"name": "n", "scopes": []})"),
        std::string(R"({"name": "n", "scopes": {"api": "*"}})"),
        std::string(R"({"name": "n", "scopes": [{"api": ""}]})"),
        std::string(R"({"name": "n", "scopes": [{"api": "*.X"}]})"),
        std::string(R"({"name": "n", "scopes": [{"api": "a b"}]})"),
        std::string(R"({"name": "n", "scopes": [{"api": 5}]})"),
        std::string(R"({"name": "n", "scopes": [{"api": "*", "method": 5}]})"),
        std::string(R"({"name": "n", "scopes": ["*"]})"),
        "{" + good + R"(, "days": 0})",
        "{" + good + R"(, "days": 3651})",
        "{" + good + R"(, "days": "soon"})",
        "{" + good + R"(, "readOnly": "yes"})",
        "{" + good + R"(, "address": "192.0.2.0/33"})",
        "{" + good + R"(, "address": 5})"}) {
    Json::Value read;
    Json::Value record;
    std::string token;
    ASSERT_TRUE(QELO::JsonHelper::fromString(terms, read)) << terms;
    EXPECT_EQ(QeloAccessTokenCreate("alice", read, record, token), QELO_TOKEN_BAD_TERMS) << terms;
    EXPECT_EQ(token, "");
  }
  EXPECT_FALSE(std::filesystem::exists(Database()));
}

TEST_F(UserTokens, UsersTokensThatCannotBeUsedAreAFailure) {
  Write("var/lib/webapi/tokens.db", std::string(8192, 'x'));
  Json::Value list;
  EXPECT_EQ(QeloAccessTokenList("alice", list), QELO_TOKEN_FAILED);
  EXPECT_EQ(SyslogCapture::Count("cannot use the access tokens [file is not a database]"), 1);
}

}  // namespace
