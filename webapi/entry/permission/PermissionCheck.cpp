#include "webapi/entry/permission/PermissionCheck.h"

#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "webapi/APIAuth.h"
#include "webapi/APIDescription.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/entry/permission/Refusal.h"
#include "webapi/entry/permission/SessionOrigin.h"
#include "webapi/entry/permission/UserClass.h"
#include "webapi/json/Literal.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Token.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/CompoundCall.h"

namespace QELO {
namespace {

constexpr int kOptionSize = 1024;    ///< bytes of a session's option with its NUL
constexpr int kTokenFailLine = 577;  ///< administrators' log filters know the message by this line

int errorOf(int result) {
  switch (result) {
    case AUTHORIZED_YES:
    case AUTHORIZED_YES_TIMED_OUT:
      return WEBAPI_ERR_NONE;
    case AUTHORIZED_TIMED_OUT:
      return WEBAPI_ERR_SESSION_TIMEOUT;
    case AUTHORIZED_UNAUTHENTICATED:
      return WEBAPI_ERR_NOT_AUTHENTICATED;
    case AUTHORIZED_ADDRESS_MISMATCH:
      return WEBAPI_ERR_ADDRESS_MISMATCH;
    default:
      return WEBAPI_ERR_NO_PERMISSION;
  }
}

/// The word for web server and clients that goes with an error, or null.
const char* serverErrorOf(int code) {
  switch (code) {
    case WEBAPI_ERR_NO_PERMISSION:
      return "noprivilege";
    case WEBAPI_ERR_SESSION_TIMEOUT:
      return "timeout";
    case WEBAPI_ERR_NOT_AUTHENTICATED:
      return "unauth";
    case WEBAPI_ERR_ADDRESS_MISMATCH:
      return "errorip";
    default:
      return nullptr;
  }
}

bool IsTokenGranted(const APIRequest& request, char* user, int size) {
  const char* token = request.GetQeloAccessTokenID();
  return token != nullptr && QeloAccessTokenGrant(token, request.GetAPIClass().c_str(),
                                                  request.GetAPIMethod().c_str(), user, size) >= 0;
}

/// The description that the request's API was found to have.
APIDescription descriptionOf(APIRequest& request) {
  return APIDescription(JsonHelper::member(request.Serialize(), "reqLib"));
}

int authLevelOf(APIRequest& request) {
  return descriptionOf(request).GetAuthLevel();
}

std::string optionOf(QeloCgiContext* context, const char* name, const char* def = "") {
  char value[kOptionSize] = {};
  return QeloCgiGetOption(context, name, value, kOptionSize) == 1 ? value : def;
}

/// Nobody rather than somebody else.
void setUserVariable(const std::string& user) {
  if (setenv(kCallerVariable, user.c_str(), 1) != 0) {
    unsetenv(kCallerVariable);
  }
}

}  // namespace

bool PermissionCheck::NeedPermission(APIRequest* request) {
  return request == nullptr || authLevelOf(*request) != APIDescription::AUTH_NONE;
}

bool PermissionCheck::SkipPermission(APIRequest* request) {
  return request != nullptr && authLevelOf(*request) == APIDescription::AUTH_SKIP;
}

bool PermissionCheck::CheckPermission(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  const CallName call(*request);
  const bool allowTimeout =
      runner_.GetMethodAttr(call.api, call.version, call.method, "allowTimeout");
  const auto result = static_cast<_tag_authorized_result_>(ResultOf(*request, allowTimeout));
  const int code = errorOf(result);
  if (request != &caller_) {
    // A request within this one, which may still hold what the check before found.
    request->InitSession(code == WEBAPI_ERR_NONE ? CallerSession::Of(caller_).ToJson()
                                                 : CallerSession::OfNobody(caller_));
    request->SetCookie("id", caller_.GetSessionID());
    setUserVariable(code == WEBAPI_ERR_NONE ? caller_.GetLoginUserName() : "");
  }
  request->SetAuthResult(result);
  response->SetError(code);
  if (code != WEBAPI_ERR_NONE) {
    return RefuseSession(*request, *response, result);
  }
  const Json::Value appPriv = descriptionOf(*request).GetAppPriv();
  if (!PassesUserChecks(*request, *response, call, appPriv)) {
    return false;
  }
  Json::Value& record = request->Serialize();
  const auto hasSession = [&record] {
    return JsonHelper::member(record, "session").type() == Json::objectValue;
  };
  if (request != &caller_ || !hasSession()) {
    // The caller's own holds already what was found.
    request->InitSession(CallerSession::Of(caller_).ToJson());
  }
  if (hasSession()) {
    record[Literal("session")][Literal("appPriv")] = JsonHelper::asString(appPriv);
  }
  request->SetAuthResult(result);
  return true;
}

/// The caller's result, or that its access token is for other calls than this one.
int PermissionCheck::ResultOf(const APIRequest& request, bool allowTimeout) {
  const unsigned slot = SlotOf(allowTimeout);
  const int code = CheckPermission(allowTimeout);
  return code == WEBAPI_ERR_NONE && !CoversInnerCall(request, findings_[slot])
             ? AUTHORIZED_UNAUTHENTICATED
             : JsonHelper::asInt(KnownResult(slot), AUTHORIZED_UNKNOWN);
}

/// A token stands for the calls that it was made for, within a compound request too.
bool PermissionCheck::CoversInnerCall(const APIRequest& request, const Finding& finding) {
  if (&request == &caller_ || !finding.byToken) {
    return true;
  }
  char user[kUserNameSize] = {};
  return IsTokenGranted(request, user, kUserNameSize);
}

bool PermissionCheck::PassesUserChecks(APIRequest& request, APIResponse& response,
                                       const CallName& call, const Json::Value& appPriv) {
  const std::string user = caller_.GetLoginUserName();
  const Json::Value& allowUser =
      descriptionOf(request).GetAllowUser(runner_.GetMethod(call.api, call.version, call.method));
  const std::string userClass = APIAuth::GetUserClass(caller_.IsAdmin(), user);
  if (user.empty() || !ListsUserClass(allowUser, userClass)) {
    return Refuse(request, response, WEBAPI_ERR_NO_PERMISSION,
                  "\"allowUser\" does not list " + userClass);
  }
  if (!HoldsAppPriv(appPriv, user, caller_.GetRemoteIP())) {
    return Refuse(request, response, WEBAPI_ERR_NO_APP_PRIVILEGE,
                  "the application privilege " + JsonHelper::asString(appPriv) + " is missing");
  }
  return true;
}

bool PermissionCheck::RefuseSession(APIRequest& request, APIResponse& response,
                                    _tag_authorized_result_ result) {
  if (result == AUTHORIZED_TOKEN_MISMATCH && authLevelOf(request) == APIDescription::AUTH_LOGIN) {
    syslog(LOG_ERR, "%s:%d Token Authentication Fail.", "WebEntry", kTokenFailLine);
  }
  const int code = errorOf(result);
  if (serverErrorOf(code) != nullptr) {
    response.SetServerError(serverErrorOf(code));
  }
  const char* token = request.GetQeloAccessTokenID();
  return Refuse(request, response, code, RefusalReason(result, token != nullptr && *token != '\0'));
}

/// The answer to a login, and to who asks for a compound request as a whole, is no refusal: the
/// method runs in spite of it.
bool PermissionCheck::Refuse(APIRequest& request, APIResponse& response, int code,
                             const std::string& reason) {
  response.SetError(code);
  if (!SkipPermission(&request) && request.GetAPIClass() != kCompoundAPI) {
    LogRefusal(caller_, reason);
  }
  return false;
}

const Json::Value& PermissionCheck::KnownResult(unsigned slot) const {
  const Json::Value& results = JsonHelper::member(permission_, "permResult");
  return results.type() == Json::arrayValue && slot < results.size() ? results[slot]
                                                                     : Json::Value::nullSingleton();
}

int PermissionCheck::CheckPermission(bool allowTimeout) {
  const unsigned slot = SlotOf(allowTimeout);
  TurnTo(slot);
  const Json::Value& known = KnownResult(slot);
  const int result = known.isInt() ? known.asInt() : Authorise(allowTimeout);
  permission_[Literal("permResult")][slot] = Json::Int64{result};
  caller_.SetAuthResult(static_cast<_tag_authorized_result_>(result));
  return errorOf(result);
}

/// Nobody may go on with what another allowance has found: the caller's request is put back to how
/// this one's check has left it, or, before that, to how it came.
void PermissionCheck::TurnTo(unsigned slot) {
  Finding* next = &findings_[slot];
  if (now_ == nullptr) {
    unchecked_.sessionId = caller_.GetSessionID();
  } else if (now_ != next) {
    now_->session = JsonHelper::member(caller_.Serialize(), "session");
    now_->sessionId = caller_.GetSessionID();
    const bool isKnown = KnownResult(slot).isInt();
    if (!isKnown) {
      unchecked_.session = CallerSession::OfNobody(caller_);
      QeloCgiInit("", context_);
      QeloCgiLoadInCookies(context_);
    }
    const Finding& shown = isKnown ? *next : unchecked_;
    caller_.InitSession(shown.session);
    caller_.SetCookie("id", shown.sessionId);
    setUserVariable(caller_.GetLoginUserName());
  }
  now_ = next;
}

/// The caller's session is asked first, then the access token.
int PermissionCheck::Authorise(bool allowTimeout) {
  int result = AUTHORIZED_NO_SESSION;
  char user[kUserNameSize] = {};
  const std::string language = QeloCgiGetLang(context_);
  const std::string session = caller_.GetSessionID();
  if (!session.empty()) {
    const CallName call(caller_);
    const QeloCgiAuthFlags flags{IsSessionFromParameter(caller_, session) ? 1U : 0U,
                                 KeepsIdle(call) ? 1U : 0U};
    const bool anyAddress =
        runner_.GetMethodAttr(call.api, call.version, call.method, "skipCheckIP");
    result = QeloCgiIsAuthorizedEx(context_, &flags, user, kUserNameSize, allowTimeout ? 1 : 0,
                                   anyAddress ? 0 : 1);
  }
  if (result < 0) {
    const char* token = caller_.GetQeloAccessTokenID();
    if (token == nullptr || *token == '\0') {
      return result;
    }
    if (!session.empty()) {
      // Nothing of a refused session may stay: a method could act on it in the token's name.
      memset(user, 0, sizeof user);
      caller_.SetCookie("id", "");
      QeloCgiInit("", context_);
    }
    const bool granted = IsTokenGranted(caller_, user, kUserNameSize);
    result = granted ? AUTHORIZED_YES : AUTHORIZED_UNAUTHENTICATED;
    findings_[SlotOf(allowTimeout)].byToken = granted;
    if (!granted) {
      user[0] = '\0';
    }
  }
  FillSession(user, language, errorOf(result) == WEBAPI_ERR_NONE);
  return result;
}

/// Whether the request is no use of the session: its method says so, or those of all its entries
/// do.
bool PermissionCheck::KeepsIdle(const CallName& call) {
  constexpr char kAttribute[] = "keepIdle";
  const Json::Value& entries = caller_.GetParamRef("compound", Json::Value::nullSingleton());
  if (entries.type() != Json::arrayValue || call.api != kCompoundAPI) {
    return runner_.GetMethodAttr(call.api, call.version, call.method, kAttribute);
  }
  return std::all_of(entries.begin(), entries.end(), [&](const Json::Value& entry) {
    return runner_.GetMethodAttr(JsonHelper::asString(JsonHelper::member(entry, "api")),
                                 JsonHelper::asInt(JsonHelper::member(entry, "version")),
                                 JsonHelper::asString(JsonHelper::member(entry, "method")),
                                 kAttribute);
  });
}

void PermissionCheck::FillSession(const std::string& user, const std::string& language,
                                  bool isAuthorized) {
  setUserVariable(user);
  CallerSession session;
  session.username = user;
  session.isAdmin = !user.empty() && QLIBGroupIsAdminGroupMem(user.c_str(), 0) == 1;
  session.sessFile = optionOf(context_, "sessfile");
  session.isTimeout = optionOf(context_, "istimeout") == "1";
  session.timeout = strtol(optionOf(context_, "timeout", "0").c_str(), nullptr, 10);
  session.isSkipCheckIP = optionOf(context_, "skipcheckip") == "1";
  session.uiLang = language;
  session.app = optionOf(context_, "app");
  session.webapi = optionOf(context_, "webapi");
  session.isAuthorized = isAuthorized;
  session.tokenEnable = QeloCgiIsTokenEnable(context_) != 0;
  caller_.InitSession(session.ToJson());
}

}  // namespace QELO
