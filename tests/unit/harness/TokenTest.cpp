// QELO.Access.Token: what becomes of a wish, by what the token store says of it.

#include <gtest/gtest.h>
#include <webapi/testing/TestHost.h>

#include "tests/support/FakePlatform.h"
#include "webapi/platform/Token.h"

namespace {

using QELO::TestHost;

class Token : public testing::Test {
 protected:
  Token() {
    EXPECT_TRUE(host.Describe(API_DIR "/QELO.Access.Token.lib.in"));
    host.AddUser("alice", 1001);
    host.LogIn("alice");
  }
  QELO::TestAnswer Call(const std::string& method, const TestHost::Params& params = {}) {
    return host.Call("QELO.Access.Token", 1, method, params);
  }
  bool WasAsked(const std::string& call) const {
    for (const std::string& made : FakePlatform::Get().calls) {
      if (made == call) {
        return true;
      }
    }
    return false;
  }

  TestHost host;
};

TEST_F(Token, WishesAreTheCallersOwn) {
  FakePlatform::Get().tokenWork = QELO_TOKEN_DONE;
  EXPECT_TRUE(Call("create").Data().isMember("token"));
  EXPECT_TRUE(WasAsked("QeloAccessTokenCreate(alice)"));
  EXPECT_TRUE(Call("list").Data().isMember("tokens"));
  EXPECT_TRUE(WasAsked("QeloAccessTokenList(alice)"));
  const QELO::TestAnswer revoked = Call("revoke", {{"id", 5}});
  EXPECT_EQ(revoked.body, R"({"success":true})");
  EXPECT_TRUE(WasAsked("QeloAccessTokenRevoke(alice, 5)"));
}

TEST_F(Token, ResultsOfTheStoreHaveCodes) {
  const std::pair<int, int> codes[] = {{QELO_TOKEN_BAD_TERMS, 400},
                                       {QELO_TOKEN_FAILED, 401},
                                       {QELO_TOKEN_TOO_MANY, 402},
                                       {QELO_TOKEN_NONE, 404}};
  for (const auto& [result, code] : codes) {
    FakePlatform::Get().tokenWork = result;
    const std::string body =
        R"({"error":{"code":)" + std::to_string(code) + R"(},"success":false})";
    EXPECT_EQ(Call("create").body, body);
    EXPECT_EQ(Call("list").body, body);
    EXPECT_EQ(Call("revoke", {{"id", 5}}).body, body);
  }
}

TEST_F(Token, IdIsANumber) {
  for (const Json::Value& id : {Json::Value("5"), Json::Value(1.5)}) {
    EXPECT_EQ(Call("revoke", {{"id", id}}).body, R"({"error":{"code":101},"success":false})");
  }
  EXPECT_EQ(Call("revoke").body, R"({"error":{"code":101},"success":false})");
}

TEST_F(Token, WhoComesByATokenMakesNone) {
  host.LogOut();
  host.SetVariable("qeloAccessToken", "T");
  FakePlatform::Get().tokenGrant = 0;
  FakePlatform::Get().tokenUser = "alice";
  EXPECT_EQ(Call("create").Code(), 403);
  EXPECT_EQ(Call("revoke", {{"id", 5}}).Code(), 403);
}

}  // namespace
