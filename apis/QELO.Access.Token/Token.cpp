// QELO.Access.Token: the access tokens of who calls.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/AccessToken.h>
#include <webapi/WebAPIError.h>

#include <string>

namespace {

using QELO::AccessToken;
using QELO::APIRequest;
using QELO::APIResponse;

constexpr char kApi[] = "QELO.Access.Token";

enum Error : int {
  kBadTerms = 400,
  kUnavailable = 401,
  kTooMany = 402,
  kSessionOnly = 403,
  kNoSuchToken = 404
};

int errorOf(AccessToken::Result result) {
  switch (result) {
    case AccessToken::TOKEN_BAD_TERMS:
      return kBadTerms;
    case AccessToken::TOKEN_TOO_MANY:
      return kTooMany;
    case AccessToken::TOKEN_NONE:
      return kNoSuchToken;
    default:
      return kUnavailable;
  }
}

/// Who has come by an access token has no session.
bool cameBySession(const APIRequest& request, APIResponse* response) {
  if (request.GetSessionID().empty()) {
    response->SetError(kSessionOnly);
    return false;
  }
  return true;
}

void Create(APIRequest* request, APIResponse* response) {
  Json::Value terms(Json::objectValue);
  Json::Value record;
  std::string token;
  if (!cameBySession(*request, response)) {
    return;
  }
  for (const char* name : {"name", "scopes", "readOnly", "address", "days"}) {
    if (request->HasParam(name)) {
      terms[name] = request->GetParam(name);
    }
  }
  const auto result = AccessToken::Create(request->GetLoginUserName(), terms, record, token);
  if (result != AccessToken::TOKEN_OK) {
    response->SetError(errorOf(result));
    return;
  }
  record["token"] = token;
  response->SetSuccess(record);
}

void List(APIRequest* request, APIResponse* response) {
  Json::Value data(Json::objectValue);
  const auto result = AccessToken::List(request->GetLoginUserName(), data["tokens"]);
  if (result != AccessToken::TOKEN_OK) {
    response->SetError(errorOf(result));
    return;
  }
  response->SetSuccess(data);
}

void Revoke(APIRequest* request, APIResponse* response) {
  const auto id = request->GetAndCheckIntegral<long long>("id");
  if (!cameBySession(*request, response)) {
    return;
  }
  if (id.IsInvalid() || !id.IsSet()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  const auto result = AccessToken::Revoke(request->GetLoginUserName(), id.Get());
  if (result != AccessToken::TOKEN_OK) {
    response->SetError(errorOf(result));
    return;
  }
  response->SetSuccess();
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "create", Create},
    {kApi, 1, "list", List},
    {kApi, 1, "revoke", Revoke},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
