// QELO.Access.Session: logging in and out, and who the caller is.

#include <webapi/APIAuth.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/LoginSession.h>
#include <webapi/WebAPIError.h>

#include <string>

namespace {

using QELO::APIRequest;
using QELO::APIResponse;
using QELO::LoginSession;
namespace JsonHelper = QELO::JsonHelper;

constexpr char kApi[] = "QELO.Access.Session";
constexpr char kCookie[] = "id";

enum Error : int {
  kWrong = 400,
  kUnavailable = 401,
  kOtherSite = 403,
  kNotPost = 405,
  kTooMany = 407
};

/// A parameter as it was typed: one that looks like JSON, as a password of digits does, has been
/// read as JSON.
std::string TextParam(const APIRequest& request, const char* name) {
  const Json::Value value = request.GetParam(name);
  return value.isNull() && request.HasParam(name) ? "null" : JsonHelper::asString(value);
}

bool IsSecure(const APIRequest& request) {
  return request.GetURLProto("") == "https";
}

/// The check before a login finds nobody logged in and says so in a header, which is no news.
void ForgetFailedCheck(APIResponse* response) {
  response->Serialize()["headers"].removeMember("x-request-error");
}

void AddSessionCookie(const APIRequest& request, APIResponse* response, const std::string& id) {
  if (!response->AddCookie(kCookie, id, "/", 0, "", IsSecure(request), true)) {
    return;
  }
  Json::Value& cookies = response->Serialize()["setCookie"];
  Json::Value& cookie = cookies[cookies.size() - 1];
  cookie = JsonHelper::asString(cookie) + "; samesite=strict";
}

void AnswerTicket(const APIRequest& request, APIResponse* response,
                  const LoginSession::Ticket& ticket) {
  AddSessionCookie(request, response, ticket.id);
  Json::Value data(Json::objectValue);
  data["sid"] = ticket.id;
  data["token"] = ticket.token;
  data["user"] = ticket.user;
  response->SetSuccess(data);
}

void AnswerTooMany(APIResponse* response, int retryAfter) {
  Json::Value errors(Json::objectValue);
  errors["retry_after"] = retryAfter;
  response->SetHeader("Retry-After", std::to_string(retryAfter));
  response->SetError(kTooMany, errors);
}

void Login(APIRequest* request, APIResponse* response) {
  ForgetFailedCheck(response);
  const std::string account = TextParam(*request, "account");
  const std::string password = TextParam(*request, "password");
  if (account.empty() || password.empty()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  LoginSession::Ticket ticket;
  switch (LoginSession::Login(*request, account, password, ticket)) {
    case LoginSession::LOGIN_OK:
      AnswerTicket(*request, response, ticket);
      return;
    case LoginSession::LOGIN_WRONG:
      response->SetError(kWrong);
      return;
    case LoginSession::LOGIN_TOO_MANY:
      AnswerTooMany(response, ticket.retryAfter);
      return;
    case LoginSession::LOGIN_NOT_POST:
      response->SetError(kNotPost);
      return;
    case LoginSession::LOGIN_OTHER_SITE:
      response->SetError(kOtherSite);
      return;
    case LoginSession::LOGIN_FAILED:
      response->SetError(kUnavailable);
      return;
  }
}

void Logout(APIRequest* request, APIResponse* response) {
  if (!LoginSession::Logout(request->GetSessionID())) {
    response->SetError(QELO::WEBAPI_ERR_NOT_AUTHENTICATED);
    return;
  }
  response->AddCookie(kCookie, "", "/", -1, "", IsSecure(*request), true);
  response->SetSuccess();
}

void Current(APIRequest* request, APIResponse* response) {
  const std::string user = request->GetLoginUserName();
  Json::Value data(Json::objectValue);
  data["user"] = user;
  data["class"] = QELO::APIAuth::GetUserClass(request->IsAdmin(), user);
  data["isAdmin"] = request->IsAdmin();
  data["language"] = request->GetUILanguage();
  data["secondsLeft"] =
      static_cast<Json::Int64>(LoginSession::SecondsLeft(request->GetSessionID()));
  data["address"] = request->GetRemoteIP();
  response->SetSuccess(data);
}

/// The API runs for callers who are not logged in, for the sake of login. The other methods stop
/// here, with the error that the permission check has set.
int CheckLoggedIn(APIRequest* request, APIResponse*) {
  return request->IsAuthorized() ? 1 : 0;
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "login", Login},
    {kApi, 1, "logout", Logout},
    {kApi, 1, "current", Current},
    {nullptr, 0, nullptr, nullptr},
};

QELO::_tag_API_CHECK_TABLE checkTable[] = {
    {kApi, 1, "logout", CheckLoggedIn, {nullptr, nullptr}},
    {kApi, 1, "current", CheckLoggedIn, {nullptr, nullptr}},
    {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
extern "C" WEBAPI_API QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return checkTable;
}
