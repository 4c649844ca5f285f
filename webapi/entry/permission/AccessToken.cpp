#include "webapi/AccessToken.h"

#include "webapi/platform/Token.h"

namespace QELO {
namespace {

AccessToken::Result resultOf(int result) {
  switch (result) {
    case QELO_TOKEN_DONE:
      return AccessToken::TOKEN_OK;
    case QELO_TOKEN_BAD_TERMS:
      return AccessToken::TOKEN_BAD_TERMS;
    case QELO_TOKEN_TOO_MANY:
      return AccessToken::TOKEN_TOO_MANY;
    case QELO_TOKEN_NONE:
      return AccessToken::TOKEN_NONE;
    default:
      return AccessToken::TOKEN_FAILED;
  }
}

}  // namespace

AccessToken::Result AccessToken::Create(const std::string& user, const Json::Value& terms,
                                        Json::Value& record, std::string& token) {
  return resultOf(QeloAccessTokenCreate(user.c_str(), terms, record, token));
}

AccessToken::Result AccessToken::List(const std::string& user, Json::Value& records) {
  return resultOf(QeloAccessTokenList(user.c_str(), records));
}

AccessToken::Result AccessToken::Revoke(const std::string& user, long long id) {
  return resultOf(QeloAccessTokenRevoke(user.c_str(), id));
}

}  // namespace QELO
