// Enciphered parameters: which text goes to which cipher, in which order, and what stays behind.

#include <cstring>

#include "tests/support/CgiFixture.h"

namespace QELO {
namespace {

constexpr char kLetter[] = "__nEkOtReHpIc=tok&__tXeTrEhPiC=sealed";

class Envelope : public CgiTest {
 protected:
  void SetUp() override {
    CgiTest::SetUp();
    platform->aesKeyResult = 0;
    platform->decryptAES = [this](const std::string& key, const std::string& cipher,
                                  std::string& plain) {
      EXPECT_EQ(key, "key");
      plain = opened;
      return cipher == "sealed";
    };
    platform->decryptParam = [](char* text) {
      if (strcmp(text, "SEALED-LINE") != 0) {
        return 0;
      }
      strcpy(text, "c=3");
      return 1;
    };
  }

  bool Take(const std::string& line) { return entry_.DetectAndDecryptParamLine(line, section_); }

  std::string opened = "b=2";  ///< what the AES text deciphers to
  TestEntry entry_;
  Json::Value section_{Json::objectValue};
};

TEST_F(Envelope, PlainLineIsCheckedAndParsed) {
  EXPECT_TRUE(Take("a=1"));
  EXPECT_EQ(section_, Parse(R"({"a": 1})"));
  EXPECT_EQ(platform->calls, std::vector<std::string>{"QeloCgiDetectAndDecryptParamLine(a=1)"});
}

TEST_F(Envelope, AesTextIsMergedIntoItsSection) {
  EXPECT_TRUE(Take(std::string("a=1&") + kLetter));
  EXPECT_EQ(section_, Parse(R"({"a": 1, "b": 2})"));
  EXPECT_EQ(platform->calls[1], "QELOCloudServiceZttokenGenerateToken(tok, 33)");
  EXPECT_EQ(platform->calls[2], "GetDecryptAESString(key, sealed)");
}

TEST_F(Envelope, AesTextReplacesParametersOfTheSameName) {
  opened = "a=2";
  EXPECT_TRUE(Take(std::string("a=1&") + kLetter));
  EXPECT_EQ(section_, Parse(R"({"a": 2})"));
}

TEST_F(Envelope, AesTokenWithoutTextStays) {
  EXPECT_TRUE(Take("__nEkOtReHpIc=tok"));
  EXPECT_EQ(section_, Parse(R"({"__nEkOtReHpIc": "tok"})"));
}

TEST_F(Envelope, AesTextWithoutTokenStays) {
  EXPECT_TRUE(Take("__tXeTrEhPiC=sealed"));
  EXPECT_EQ(section_, Parse(R"({"__tXeTrEhPiC": "sealed"})"));
}

TEST_F(Envelope, EmptyAesTextFailsAndLosesItsKeys) {
  EXPECT_FALSE(Take("__nEkOtReHpIc=tok&__tXeTrEhPiC="));
  EXPECT_EQ(section_, Parse("{}"));
  EXPECT_EQ(Calls("QELOCloudServiceZttokenGenerateToken"), 0);
}

TEST_F(Envelope, EmptyAesTokenFails) {
  EXPECT_FALSE(Take("__nEkOtReHpIc=&__tXeTrEhPiC=sealed"));
}

TEST_F(Envelope, EmptyAesTextMakesTheRequestFail) {
  Get("__nEkOtReHpIc=tok&__tXeTrEhPiC=");
  EXPECT_EQ(Serve().Code(), 101);
}

TEST_F(Envelope, AesKeyThatCannotBeDerivedFails) {
  platform->aesKeyResult = -1;
  EXPECT_FALSE(Take(kLetter));
  EXPECT_EQ(Calls("GetDecryptAESString"), 0);
}

TEST_F(Envelope, AesTextThatCannotBeDecipheredFails) {
  EXPECT_FALSE(Take("__nEkOtReHpIc=tok&__tXeTrEhPiC=other"));
}

TEST_F(Envelope, AesTextThatIsNoParameterLineFails) {
  opened = "b=%zz";
  EXPECT_FALSE(Take(kLetter));
}

TEST_F(Envelope, CipherTextIsMergedIntoWebapi) {
  EXPECT_TRUE(Take(R"(a=1&webapi={"__cIpHeRtExT":"SEALED-LINE","__cIpHeRtOkEn":"t","d":4})"));
  EXPECT_EQ(section_, Parse(R"({"a": 1, "webapi": {"c": 3, "d": 4}})"));
  EXPECT_EQ(platform->calls[1], "QeloCgiDecryptParam(SEALED-LINE)");
}

TEST_F(Envelope, CipherTextThatFailsIsLeftOut) {
  EXPECT_TRUE(Take(R"(a=1&webapi={"__cIpHeRtExT":"garbage","__cIpHeRtOkEn":"t"})"));
  EXPECT_EQ(section_, Parse(R"({"a": 1, "webapi": {}})"));
}

TEST_F(Envelope, CipherTextThatIsNoTextIsLeftOut) {
  EXPECT_TRUE(Take(R"(webapi={"__cIpHeRtExT":[1]})"));
  EXPECT_EQ(section_, Parse(R"({"webapi": {}})"));
  EXPECT_EQ(platform->calls[1], "QeloCgiDecryptParam()");
}

TEST_F(Envelope, CipherTokenAloneStays) {
  EXPECT_TRUE(Take(R"(webapi={"__cIpHeRtOkEn":"t"})"));
  EXPECT_EQ(section_, Parse(R"({"webapi": {"__cIpHeRtOkEn": "t"}})"));
}

TEST_F(Envelope, CipherTextOutsideWebapiIsNotTheEntrysBusiness) {
  EXPECT_TRUE(Take("__cIpHeRtExT=SEALED-LINE"));
  EXPECT_EQ(section_, Parse(R"({"__cIpHeRtExT": "SEALED-LINE"})"));
}

TEST_F(Envelope, WebapiThatIsNoObjectStays) {
  EXPECT_TRUE(Take(R"(webapi=["__cIpHeRtExT"])"));
  EXPECT_EQ(section_, Parse(R"({"webapi": ["__cIpHeRtExT"]})"));
}

TEST_F(Envelope, AesTextWithinCipherTextIsDecipheredToo) {
  platform->decryptParam = [](char* text) {
    strcpy(text, kLetter);
    return 1;
  };
  const std::string room(64, 'x');
  EXPECT_TRUE(Take(R"(webapi={"__cIpHeRtExT":")" + room + R"("})"));
  EXPECT_EQ(section_, Parse(R"({"webapi": {"b": 2}})"));
}

TEST_F(Envelope, DecryptParamSaysWhatBecameOfIt) {
  EXPECT_TRUE(entry_.DecryptParam("SEALED-LINE", section_));
  EXPECT_EQ(section_, Parse(R"({"c": 3})"));
  EXPECT_FALSE(entry_.DecryptParam("garbage", section_));
  platform->decryptParam = [](char* text) {
    strcpy(text, "a=%zz");
    return 1;
  };
  EXPECT_FALSE(entry_.DecryptParam("xxxxxxxx", section_));
  platform->decryptParam = [](char* text) {
    text[0] = '\0';
    return 1;
  };
  Json::Value nothing(Json::objectValue);
  EXPECT_TRUE(entry_.DecryptParam("x", nothing));
  EXPECT_EQ(nothing, Parse("{}"));
}

TEST_F(Envelope, ParametersOfACallArriveDeciphered) {
  opened = "api=QELO.Test.Good&version=1&method=echo&x=sealed";
  Describe(R"({"authLevel": 0})", R"({"grantByDefault": true})");
  Post(kLetter);
  EXPECT_EQ(Serve().Json()["data"]["x"], "sealed");
}

}  // namespace
}  // namespace QELO
