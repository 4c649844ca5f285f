#include "webapi/CipherKey.h"

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

using CipherKeyTest = CgiTest;

TEST_F(CipherKeyTest, GetPublicGivesThePlatforms) {
  platform->publicKey = "-----BEGIN PUBLIC KEY-----";
  std::string pem;
  EXPECT_TRUE(CipherKey::GetPublic(pem));
  EXPECT_EQ(pem, platform->publicKey);
}

TEST_F(CipherKeyTest, WithoutAKeyNothingIsGiven) {
  std::string pem = "before";
  EXPECT_FALSE(CipherKey::GetPublic(pem));
  EXPECT_EQ(pem, "before");
}

}  // namespace
}  // namespace QELO
