#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/model/request/APIRequestPrivate.h"

using namespace QELO;

namespace {

/// "cipher" is a text in this: the line behind "c:" or "a:". Anything else cannot be deciphered.
class RequestDecrypt : public testing::Test {
 protected:
  RequestDecrypt() {
    FakePlatform& fake = FakePlatform::Reset();
    fake.aesKeyResult = 0;
    fake.decryptParam = [](char* text) {
      if (strncmp(text, "c:", 2) != 0) {
        return 0;
      }
      memmove(text, text + 2, strlen(text) - 1);
      return 1;
    };
    fake.decryptAES = [](const std::string& key, const std::string& cipher, std::string& plain) {
      plain = cipher.substr(0, 2) == "a:" ? cipher.substr(2) : "";
      return key == "key" && !plain.empty();
    };
  }

  /// Deciphers in place; the text of what is there afterwards.
  std::string decrypted(const std::string& section, bool expected = true) {
    Json::Value value = json(section);
    EXPECT_EQ(request_.DecryptParam(value), expected) << section;
    return JsonHelper::toString(value);
  }

  APIRequestPrivate request_{nullptr};
};

}  // namespace

TEST_F(RequestDecrypt, LeavesPlainParametersAlone) {
  EXPECT_EQ(decrypted(R"({"a":1,"webapi":{"b":[2]}})"), R"({"a":1,"webapi":{"b":[2]}})");
  EXPECT_EQ(decrypted("{}"), "{}");
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST_F(RequestDecrypt, MergesTheDecipheredLine) {
  EXPECT_EQ(decrypted(R"({"a":1,"b":1,"__cIpHeRtExT":"c:b=2&c=x%20y"})"),
            R"({"a":1,"b":2,"c":"x y"})");
}

TEST_F(RequestDecrypt, MergesTheDecipheredLineOfTheAesEnvelope) {
  EXPECT_EQ(decrypted(R"({"a":1,"__nEkOtReHpIc":"token","__tXeTrEhPiC":"a:b=2"})"),
            R"({"a":1,"b":2})");
  EXPECT_EQ(FakePlatform::Get().calls,
            (std::vector<std::string>{"QELOCloudServiceZttokenGenerateToken(token, 33)",
                                      "GetDecryptAESString(key, a:b=2)"}));
}

TEST_F(RequestDecrypt, UndoesAnAesEnvelopeInsideTheOther) {
  EXPECT_EQ(decrypted(R"({"__cIpHeRtExT":"c:__nEkOtReHpIc=token&__tXeTrEhPiC=a%3Ab%3D2"})"),
            R"({"b":2})");
}

TEST_F(RequestDecrypt, GoesDownThroughWebapi) {
  EXPECT_EQ(decrypted(R"({"webapi":{"__cIpHeRtExT":"c:a=1",
                          "webapi":{"__nEkOtReHpIc":"t","__tXeTrEhPiC":"a:b=2"}}})"),
            R"({"webapi":{"a":1,"webapi":{"b":2}}})");
}

TEST_F(RequestDecrypt, LeavesHalfAnAesEnvelopeUntouched) {
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"token"})"), R"({"__nEkOtReHpIc":"token"})");
  EXPECT_EQ(decrypted(R"({"__tXeTrEhPiC":"a:b=2"})"), R"({"__tXeTrEhPiC":"a:b=2"})");
}

TEST_F(RequestDecrypt, FailsOnAnEmptyTokenOrText) {
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"","__tXeTrEhPiC":"a:b=2"})", false), "{}");
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"token","__tXeTrEhPiC":""})", false), "{}");
  EXPECT_TRUE(FakePlatform::Get().calls.empty());
}

TEST_F(RequestDecrypt, FailsWhenNoKeyCanBeDerived) {
  FakePlatform::Get().aesKeyResult = -1;
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"token","__tXeTrEhPiC":"a:b=2","a":1})", false),
            R"({"a":1})");
}

TEST_F(RequestDecrypt, FailsWhenTheTextCannotBeDeciphered) {
  EXPECT_EQ(decrypted(R"({"__cIpHeRtExT":"broken","a":1})", false), R"({"a":1})");
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"t","__tXeTrEhPiC":"broken","a":1})", false),
            R"({"a":1})");
}

TEST_F(RequestDecrypt, FailsWhenTheDecipheredLineIsMalformed) {
  EXPECT_EQ(decrypted(R"({"__cIpHeRtExT":"c:%zz=1"})", false), "{}");
  EXPECT_EQ(decrypted(R"({"__nEkOtReHpIc":"t","__tXeTrEhPiC":"a:%zz=1"})", false), "{}");
}

TEST_F(RequestDecrypt, StopsAtTheFirstLevelThatFails) {
  EXPECT_EQ(decrypted(R"({"__cIpHeRtExT":"broken","webapi":{"__cIpHeRtExT":"c:a=1"}})", false),
            R"({"webapi":{"__cIpHeRtExT":"c:a=1"}})");
}

TEST_F(RequestDecrypt, TakesWhatIsNoObjectAsNothingToDo) {
  for (const char* section : {"null", "[1]", "\"__cIpHeRtExT\"", "1", R"({"webapi":"text"})",
                              R"({"webapi":[{"__cIpHeRtExT":"c:a=1"}]})"}) {
    EXPECT_EQ(decrypted(section), JsonHelper::toString(json(section)));
  }
  EXPECT_EQ(decrypted(R"({"__cIpHeRtExT":[1]})", false), "{}");
}

TEST_F(RequestDecrypt, IsAppliedToParametersThatARequestTakes) {
  Json::Value params;
  params["getParam"]["__cIpHeRtExT"] = "c:api=A&version=2&method=get&x=secret";
  APIRequest request;
  request.InitParam(params, false);
  EXPECT_EQ(request.GetAPIClass(), "A");
  EXPECT_EQ(request.GetAPIVersion(), 2);
  EXPECT_EQ(request.GetParam("x"), Json::Value("secret"));
  EXPECT_FALSE(request.HasParam("__cIpHeRtExT"));
  EXPECT_TRUE(params["getParam"].isMember("__cIpHeRtExT")) << "the caller's value changed";
}

TEST_F(RequestDecrypt, FailureLeavesTheRequestItsOtherParameters) {
  const APIRequest request = requestWithParams(R"({"api":"A","__cIpHeRtExT":"broken"})");
  EXPECT_EQ(request.GetAPIClass(), "A");
  EXPECT_EQ(request.GetParam(""), json(R"({"api":"A"})"));
}

TEST_F(RequestDecrypt, IsAppliedToPostedParametersToo) {
  Json::Value params;
  params["postParam"]["__cIpHeRtExT"] = "c:api=A&x=secret";
  APIRequest request;
  request.InitParam(params, false);
  EXPECT_EQ(request.GetAPIClass(), "A");
  EXPECT_EQ(request.GetParam("x"), Json::Value("secret"));
}
