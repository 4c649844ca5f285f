#include "webapi/APIAuth.h"

#include <cstdlib>
#include <utility>

#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/entry/permission/SessionOrigin.h"
#include "webapi/entry/permission/UserClass.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Session.h"

namespace QELO {
namespace {

constexpr char kUserStore[] = "current.users";

int errorOf(int result) {
  switch (result) {
    case AUTHORIZED_YES:
    case AUTHORIZED_YES_TIMED_OUT:
      return WEBAPI_ERR_NONE;
    case AUTHORIZED_TIMED_OUT:
      return WEBAPI_ERR_SESSION_TIMEOUT;
    case AUTHORIZED_BROKEN:
      return WEBAPI_ERR_SESSION_INTERRUPTED;
    case AUTHORIZED_ADDRESS_MISMATCH:
      return WEBAPI_ERR_ADDRESS_MISMATCH;
    default:
      return WEBAPI_ERR_NO_PERMISSION;
  }
}

/// The session that the process's own cookies name, which is the one that the CGI library checks.
std::string processSession() {
  const char* cookies = getenv("HTTP_COOKIE");
  Json::Value environment(Json::objectValue);
  environment["HTTP_COOKIE"] = cookies != nullptr ? cookies : "";
  APIRequest own;
  own.InitEnv(std::move(environment));
  return own.GetSessionID();
}

/// Asks the CGI library who the session belongs to.
/// @param user  receives the login name
/// @return 0, or the web-API error code
int checkSession(const APIRequest& request, const char* session, bool allowTimeout,
                 std::string& user) {
  if (QLIBCConfGetARDOTimeout() < 0) {  // without the setting no session's age can be judged
    return WEBAPI_ERR_NO_PERMISSION;
  }
  if (session == nullptr || request.GetSessionID() != session || processSession() != session) {
    return WEBAPI_ERR_NO_PERMISSION;
  }
  alignas(void*) QeloCgiContext context{};
  if (QeloCgiInitEx(kUserStore, &context) != 1) {
    return WEBAPI_ERR_NO_PERMISSION;
  }
  QeloCgiLoadInCookies(&context);
  char name[kUserNameSize] = {};
  const QeloCgiAuthFlags flags{IsSessionFromParameter(request, session) ? 1U : 0U, 0};
  const int result =
      QeloCgiIsAuthorizedEx(&context, &flags, name, kUserNameSize, allowTimeout ? 1 : 0, 1);
  user = name;
  return errorOf(result);
}

/// The user-class test for the session's user. A request's word on who is an administrator holds
/// for its own login user alone: of another user the host is asked.
bool isAllowed(APIRequest& request, const std::string& user) {
  if (request.GetLoginUserName() == user) {
    return APIAuth::CheckAllowUser(&request, user.c_str());
  }
  Json::Value description(Json::objectValue);
  description["allowUser"] = request.GetAPIInfo("allowUser", Json::Value());
  Json::Value session(Json::objectValue);
  session["isAdmin"] = QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
  APIRequest own;
  own.InitAPIInfo(description);
  own.InitSession(std::move(session));
  return APIAuth::CheckAllowUser(&own, user.c_str());
}

}  // namespace

std::string APIAuth::GetUserClass(bool isAdmin, const std::string& user) {
  const char* kind = user.find('\\') != std::string::npos  ? "domain"
                     : user.find('@') != std::string::npos ? "ldap"
                                                           : "local";
  return std::string(isAdmin ? "admin." : "normal.") + kind;
}

bool APIAuth::CheckAllowUser(APIRequest* request, const char* user) {
  return request != nullptr && user != nullptr && *user != '\0' &&
         ListsUserClass(request->GetAPIInfo("allowUser", Json::Value()),
                        GetUserClass(request->IsAdmin(), user));
}

bool APIAuth::CheckPermission(APIRequest* request, APIResponse* response, const char* session,
                              bool allowTimeout) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  std::string user;
  int code = checkSession(*request, session, allowTimeout, user);
  if (code == WEBAPI_ERR_NONE && !isAllowed(*request, user)) {
    code = WEBAPI_ERR_NO_PERMISSION;
  }
  if (code == WEBAPI_ERR_NONE &&
      !HoldsAppPriv(request->GetAPIInfo("appPriv", ""), user, request->GetRemoteIP())) {
    code = WEBAPI_ERR_NO_APP_PRIVILEGE;
  }
  if (code != WEBAPI_ERR_NONE) {
    response->SetError(code);
  }
  return code == WEBAPI_ERR_NONE;
}

bool APIAuth::UpdateTimeout(APIRequest* request) {
  if (request == nullptr || request->GetSessionID().empty()) {
    return false;
  }
  return QeloSessionRefresh(request->GetSessionID().c_str()) == 0;
}

bool APIAuth::MayCall(const APIRequest& request, const Json::Value& description,
                      const Json::Value& attributes) {
  const APIDescription api(description);
  if (api.GetAuthLevel() == APIDescription::AUTH_NONE ||
      api.GetAuthLevel() == APIDescription::AUTH_SKIP) {
    return true;
  }
  const std::string user = request.GetLoginUserName();
  return request.IsAuthorized() && !user.empty() &&
         ListsUserClass(api.GetAllowUser(attributes), GetUserClass(request.IsAdmin(), user)) &&
         HoldsAppPriv(api.GetAppPriv(), user, request.GetRemoteIP());
}

}  // namespace QELO
