// QELO.Access.Token: the access tokens of who calls.

#include <webapi/AccessToken.h>
#include <webapi/Method.h>

#include <string>

namespace {

using QELO::AccessToken;
using QELO::Call;

enum Code : int {
  kBadTerms = 400,
  kUnavailable = 401,
  kTooMany = 402,
  kSessionOnly = 403,
  kNoSuchToken = 404
};

void Expect(AccessToken::Result result) {
  switch (result) {
    case AccessToken::TOKEN_OK:
      return;
    case AccessToken::TOKEN_BAD_TERMS:
      throw QELO::Error{kBadTerms};
    case AccessToken::TOKEN_TOO_MANY:
      throw QELO::Error{kTooMany};
    case AccessToken::TOKEN_NONE:
      throw QELO::Error{kNoSuchToken};
    default:
      throw QELO::Error{kUnavailable};
  }
}

/// Who has come by an access token has no session.
void ExpectSession(const Call& call) {
  if (call.Request().GetSessionID().empty()) {
    throw QELO::Error{kSessionOnly};
  }
}

Json::Value Create(const Call& call) {
  Json::Value terms(Json::objectValue);
  Json::Value record;
  std::string token;
  ExpectSession(call);
  for (const char* name : {"name", "scopes", "readOnly", "address", "days"}) {
    if (call.Has(name)) {
      terms[name] = call.Request().GetParam(name);
    }
  }
  Expect(AccessToken::Create(call.User(), terms, record, token));
  record["token"] = token;
  return record;
}

Json::Value List(const Call& call) {
  Json::Value data(Json::objectValue);
  Expect(AccessToken::List(call.User(), data["tokens"]));
  return data;
}

void Revoke(const Call& call) {
  const auto id = call.Request().GetAndCheckIntegral<long long>("id");
  ExpectSession(call);
  if (id.IsInvalid() || !id.IsSet()) {
    throw QELO::Error{QELO::WEBAPI_ERR_BAD_REQUEST};
  }
  Expect(AccessToken::Revoke(call.User(), id.Get()));
}

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  using QELO::Method;
  static auto table = QELO::MethodTable(
      "QELO.Access.Token", 1,
      {{"create", Method<Create>}, {"list", Method<List>}, {"revoke", Method<Revoke>}});
  return table.data();
}
