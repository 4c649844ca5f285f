// QELO.Access.Session: logging in and out, and who the caller is.

#include <webapi/APIAuth.h>
#include <webapi/JsonHelper.h>
#include <webapi/LoginSession.h>
#include <webapi/Method.h>

#include <string>

namespace {

using QELO::APIRequest;
using QELO::APIResponse;
using QELO::Call;
using QELO::LoginSession;
namespace JsonHelper = QELO::JsonHelper;

constexpr char kApi[] = "QELO.Access.Session";
constexpr char kCookie[] = "id";

enum Code : int {
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
void ForgetFailedCheck(APIResponse& response) {
  response.Serialize()["headers"].removeMember("x-request-error");
}

void AddSessionCookie(const Call& call, const std::string& id) {
  if (!call.Response().AddCookie(kCookie, id, "/", 0, "", IsSecure(call.Request()), true)) {
    return;
  }
  Json::Value& cookies = call.Response().Serialize()["setCookie"];
  Json::Value& cookie = cookies[cookies.size() - 1];
  cookie = JsonHelper::asString(cookie) + "; samesite=strict";
}

Json::Value DataOf(const LoginSession::Ticket& ticket) {
  Json::Value data(Json::objectValue);
  data["sid"] = ticket.id;
  data["token"] = ticket.token;
  data["user"] = ticket.user;
  return data;
}

QELO::Error TooMany(const Call& call, int retryAfter) {
  Json::Value errors(Json::objectValue);
  errors["retry_after"] = retryAfter;
  call.Response().SetHeader("Retry-After", std::to_string(retryAfter));
  return {kTooMany, errors};
}

Json::Value Login(const Call& call) {
  ForgetFailedCheck(call.Response());
  const std::string account = TextParam(call.Request(), "account");
  const std::string password = TextParam(call.Request(), "password");
  if (account.empty() || password.empty()) {
    throw QELO::Error{QELO::WEBAPI_ERR_BAD_REQUEST};
  }
  LoginSession::Ticket ticket;
  switch (LoginSession::Login(call.Request(), account, password, ticket)) {
    case LoginSession::LOGIN_OK:
      AddSessionCookie(call, ticket.id);
      return DataOf(ticket);
    case LoginSession::LOGIN_WRONG:
      throw QELO::Error{kWrong};
    case LoginSession::LOGIN_TOO_MANY:
      throw TooMany(call, ticket.retryAfter);
    case LoginSession::LOGIN_NOT_POST:
      throw QELO::Error{kNotPost};
    case LoginSession::LOGIN_OTHER_SITE:
      throw QELO::Error{kOtherSite};
    case LoginSession::LOGIN_FAILED:
      break;
  }
  throw QELO::Error{kUnavailable};
}

void Logout(const Call& call) {
  if (!LoginSession::Logout(call.Request().GetSessionID())) {
    throw QELO::Error{QELO::WEBAPI_ERR_NOT_AUTHENTICATED};
  }
  call.Response().AddCookie(kCookie, "", "/", -1, "", IsSecure(call.Request()), true);
}

Json::Value Current(const Call& call) {
  const std::string user = call.User();
  Json::Value data(Json::objectValue);
  data["user"] = user;
  data["class"] = QELO::APIAuth::GetUserClass(call.IsAdmin(), user);
  data["isAdmin"] = call.IsAdmin();
  data["language"] = call.Request().GetUILanguage();
  data["secondsLeft"] =
      static_cast<Json::Int64>(LoginSession::SecondsLeft(call.Request().GetSessionID()));
  data["address"] = call.Request().GetRemoteIP();
  return data;
}

/// The API runs for callers who are not logged in, for the sake of login. The other methods stop
/// here, with the error that the permission check has set.
bool IsLoggedIn(const Call& call) {
  return call.Request().IsAuthorized();
}

QELO::_tag_API_CHECK_TABLE checkTable[] = {
    {kApi, 1, "logout", QELO::Check<IsLoggedIn>, {nullptr, nullptr}},
    {kApi, 1, "current", QELO::Check<IsLoggedIn>, {nullptr, nullptr}},
    {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  using QELO::Method;
  static auto table = QELO::MethodTable(
      kApi, 1,
      {{"login", Method<Login>}, {"logout", Method<Logout>}, {"current", Method<Current>}});
  return table.data();
}
extern "C" WEBAPI_API QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return checkTable;
}
