// Users' access tokens, of which there are none: each wish ends as the fake platform's field says.

#include <string>

#include "tests/support/FakePlatform.h"
#include "webapi/platform/Token.h"

int QeloAccessTokenCreate(const char* user, const Json::Value&, Json::Value&, std::string&) {
  FakePlatform::Get().calls.push_back(std::string("QeloAccessTokenCreate(") + user + ")");
  return FakePlatform::Get().tokenWork;
}

int QeloAccessTokenList(const char* user, Json::Value&) {
  FakePlatform::Get().calls.push_back(std::string("QeloAccessTokenList(") + user + ")");
  return FakePlatform::Get().tokenWork;
}

int QeloAccessTokenRevoke(const char* user, long long id) {
  FakePlatform::Get().calls.push_back(std::string("QeloAccessTokenRevoke(") + user + ", " +
                                      std::to_string(id) + ")");
  return FakePlatform::Get().tokenWork;
}
