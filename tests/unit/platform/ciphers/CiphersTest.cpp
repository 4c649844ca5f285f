#include <gtest/gtest.h>

#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"

namespace {

int detect(std::string line) {
  const std::string before = line;
  const int result = QeloCgiDetectAndDecryptParamLine(line.data());
  EXPECT_EQ(line, before);
  return result;
}

TEST(Ciphers, PlainLineIsGood) {
  EXPECT_EQ(detect(""), 1);
  EXPECT_EQ(detect("api=QELO.X&version=1"), 1);
  EXPECT_EQ(detect("a=__cIpHeRtExT"), 1);
  EXPECT_EQ(detect("__ciphertext=x"), 1);
  EXPECT_EQ(detect("x__cIpHeRtExT=x"), 1);
  EXPECT_EQ(detect("webapi={\"__cIpHeRtExT\":\"x\"}"), 1);
}

TEST(Ciphers, EncipheredLineIsAFailure) {
  EXPECT_EQ(detect("__cIpHeRtExT=x"), 0);
  EXPECT_EQ(detect("a=b&__cIpHeRtExT=x&c=d"), 0);
  EXPECT_EQ(detect("__cIpHeRtExT"), 0);
  EXPECT_EQ(detect("%5F_cIpHeRtExT=x"), 0);
}

TEST(Ciphers, NoLineIsAFailure) {
  EXPECT_EQ(QeloCgiDetectAndDecryptParamLine(nullptr), 0);
}

TEST(Ciphers, NoneIsServed) {
  char text[] = "text";
  EXPECT_EQ(QeloCgiDecryptParam(text), 0);
  EXPECT_STREQ(text, "text");
  char key[33] = "before";
  EXPECT_LT(QELOCloudServiceZttokenGenerateToken("token", key, sizeof key), 0);
  EXPECT_STREQ(key, "");
  std::string plain = "before";
  EXPECT_FALSE(QELO::CredRequestUtil::GetDecryptAESString("key", "cipher", plain));
  EXPECT_EQ(plain, "before");
}

}  // namespace
