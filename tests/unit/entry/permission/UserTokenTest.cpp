// Access tokens that an API makes for its caller: what the host says becomes what the API is told.

#include <gtest/gtest.h>

#include "tests/support/FakePlatform.h"
#include "webapi/AccessToken.h"
#include "webapi/platform/Token.h"

namespace QELO {
namespace {

TEST(UserToken, ResultsAreTheHosts) {
  FakePlatform& platform = FakePlatform::Reset();
  const std::pair<int, AccessToken::Result> rows[] = {
      {QELO_TOKEN_DONE, AccessToken::TOKEN_OK},
      {QELO_TOKEN_BAD_TERMS, AccessToken::TOKEN_BAD_TERMS},
      {QELO_TOKEN_TOO_MANY, AccessToken::TOKEN_TOO_MANY},
      {QELO_TOKEN_NONE, AccessToken::TOKEN_NONE},
      {QELO_TOKEN_FAILED, AccessToken::TOKEN_FAILED},
      {-99, AccessToken::TOKEN_FAILED}};
  for (const auto& [result, expected] : rows) {
    platform.calls.clear();
    platform.tokenWork = result;
    Json::Value record;
    std::string token;
    EXPECT_EQ(AccessToken::Create("ann", Json::objectValue, record, token), expected);
    EXPECT_EQ(AccessToken::List("ann", record), expected);
    EXPECT_EQ(AccessToken::Revoke("ann", 7), expected);
    EXPECT_EQ(platform.calls,
              (std::vector<std::string>{"QeloAccessTokenCreate(ann)", "QeloAccessTokenList(ann)",
                                        "QeloAccessTokenRevoke(ann, 7)"}));
  }
}

}  // namespace
}  // namespace QELO
