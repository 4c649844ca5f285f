#include "webapi/entry/sharing/LinkCheck.h"

#include <time.h>

#include <algorithm>
#include <climits>
#include <cstdlib>

#include "webapi/APIDescription.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/entry/permission/PermissionCheck.h"
#include "webapi/entry/permission/Refusal.h"
#include "webapi/entry/sharing/HeldIds.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Sharing.h"
#include "webapi/runner/execution/Credentials.h"
#include "webapi/runner/execution/Fence.h"
#include "webapi/runner/execution/StandardStreams.h"
#include "webapi/runner/execution/WorkingDirectory.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WebEntry";

/// What a result of QeloSharingIsAuthorized other than 1 comes to.
struct Outcome {
  int result;  ///< of the platform
  int code;    ///< for the client
  _tag_authorized_result_ stored;
  const char* reason;  ///< for the log
};

constexpr Outcome kOutcomes[] = {
    {-8, WEBAPI_ERR_ADDRESS_MISMATCH, AUTHORIZED_ADDRESS_MISMATCH,
     "the sharing session is bound to another address"},
    {-7, WEBAPI_ERR_SHARING_MISMATCH, AUTHORIZED_TOKEN_MISMATCH,
     "the sharing session was not opened for this link"},
    {-6, WEBAPI_ERR_SHARING_DENIED, AUTHORIZED_REFUSED, "the sharing link is not to be used"},
    {-5, WEBAPI_ERR_SHARING_NO_SESSION, AUTHORIZED_UNAUTHENTICATED,
     "the sharing link needs a session"},
    {-4, WEBAPI_ERR_BAD_REQUEST, AUTHORIZED_TOKEN_MISMATCH, "what was sent is no sharing id"},
    {-3, WEBAPI_ERR_BAD_REQUEST, AUTHORIZED_TOKEN_MISMATCH, "sharing links cannot be looked up"},
    {-2, WEBAPI_ERR_SHARING_REFUSED, AUTHORIZED_NO_SESSION, "there is no such sharing link"},
    {-1, WEBAPI_ERR_SHARING_TIMEOUT, AUTHORIZED_TIMED_OUT, "the sharing session has timed out"},
};
constexpr Outcome kUnknownOutcome{0, WEBAPI_ERR_BAD_REQUEST, AUTHORIZED_TOKEN_MISMATCH,
                                  "the sharing link's check has no known result"};

const Outcome& outcomeOf(int result) {
  const auto* found = std::find_if(std::begin(kOutcomes), std::end(kOutcomes),
                                   [result](const Outcome& row) { return row.result == result; });
  return found != std::end(kOutcomes) ? *found : kUnknownOutcome;
}

const char* orNull(const std::string& text) {
  return text.empty() ? nullptr : text.c_str();
}

/// Bytes of the body that the server announces; what is no number of bytes is more than any limit.
long long bodySizeOf(const APIRequest& request) {
  const std::string length = JsonHelper::asString(request.GetEnv("CONTENT_LENGTH", ""));
  long long size = 0;
  const bool isNumber = ParseNumber(length, size) && size >= 0;
  return isNumber || length.empty() ? size : LLONG_MAX;
}

int askPlatform(const APIRequest& request) {
  const std::string id = request.GetSharingID();
  const std::string session = request.GetSharingSID();
  const std::string address = request.GetRemoteIP();
  const QeloSharingVisit visit{address.c_str(), bodySizeOf(request)};
  return QeloSharingIsAuthorized(orNull(id), orNull(session), &visit);
}

/// Nothing of a login that a browser sent along stays: a method could act on it for the visitor.
void forgetLogin(APIRequest& request) {
  request.SetCookie("id", "");
  request.InitSession(CallerSession::OfNobody(request));
  if (getenv(kCallerVariable) != nullptr) {
    unsetenv(kCallerVariable);
  }
}

/// The user with this id; "" when there is none. Of several the one whom the link names.
std::string userOf(uid_t uid, const std::string& owner) {
  QeloUser* found = nullptr;
  if (QELOUserGetByUID(uid, &found) != 0 || found == nullptr) {
    return "";
  }
  std::string name = found->name;
  QELOUserFree(found);
  uid_t ownerUid = 0;
  gid_t ownerGid = 0;
  const bool isOwner = name != owner && !owner.empty() &&
                       QELOUserGetUGID(owner.c_str(), &ownerUid, &ownerGid) == 0 && ownerUid == uid;
  return isOwner ? owner : name;
}

/// The application privilege that the API asks for, where the user holds it.
std::string heldPrivilege(APIRequest& request, const std::string& user) {
  const std::string wanted = JsonHelper::asString(
      APIDescription(JsonHelper::member(request.Serialize(), "reqLib")).GetAppPriv());
  const bool isHeld =
      !wanted.empty() && !user.empty() &&
      QLIBAppPrivUserHas(user.c_str(), wanted.c_str(), request.GetRemoteIP().c_str()) != 0;
  return isHeld ? wanted : "";
}

}  // namespace

bool LinkCheck::Refuse(APIRequest& request, APIResponse& response, int code, const char* reason) {
  response.SetError(code);
  if (!PermissionCheck::SkipPermission(&request)) {
    LogRefusal(request, reason);
  }
  return false;
}

bool LinkCheck::CheckSharingPermission(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  if (request->IsSharing()) {
    forgetLogin(*request);
  }
  if (!request->IsSharing() || !runner_.GetMethodAttr(request, "allowSharing")) {
    request->SetAuthResult(AUTHORIZED_UNKNOWN);
    return Refuse(*request, *response, WEBAPI_ERR_SHARING_REFUSED,
                  "the method is not for sharing links");
  }
  const int result = askPlatform(*request);
  if (result != AUTHORIZED_YES) {
    const Outcome& outcome = outcomeOf(result);
    request->SetAuthResult(outcome.stored);
    return Refuse(*request, *response, outcome.code, outcome.reason);
  }
  if (!runner_.GetMethodAttr(request, "skipSharingAppCheck") &&
      !CheckSharingAppPermission(request, response)) {
    return Refuse(*request, *response, WEBAPI_ERR_SHARING_APPLICATION,
                  "the sharing link's application refuses the call");
  }
  if (request->GetSharingEntry().get_protect_type() == sharing::SHARING_PROTECT_OWNER) {
    InitSharingSession(request);
  }
  request->SetAuthResult(AUTHORIZED_YES);
  return true;
}

bool LinkCheck::CheckSharingAppPermission(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr || Credentials::AreLost()) {
    return false;
  }
  // The library's constructors are foreign code too.
  const WorkingDirectory directory;
  const StandardStreams streams(true, true);
  if (!directory.IsSaved() || !streams.IsShut()) {
    WEBAPI_LOG(kSource, "cannot shut the standard streams, or keep the working directory");
    return false;
  }
  const std::string path = CheckLibraries::GetSharingCheckLibPath(request);
  _tag_API_SHARING_CHECK_TABLE* table = nullptr;
  bool (*check)(APIRequest*, APIResponse*) = nullptr;
  if (!libraries_.OpenSharingCheckLib(request, &table) ||
      !CheckLibraries::GetSharingCheckFunc(request, table, &check) || check == nullptr) {
    return false;
  }
  HeldIds ids;
  if (!ids.Save()) {
    return false;
  }
  bool allows = false;
  if (InitCredentialsByExecutable(path.c_str(), true)) {
    Fence(
        "sharing check function", [&] { allows = check(request, response); }, kSource);
  } else {
    WEBAPI_LOG(kSource, "cannot take the credentials of %s. [%m]", LogText(path).c_str());
  }
  return ids.GiveBack() && allows;
}

void LinkCheck::InitSharingSession(APIRequest* request) {
  if (request == nullptr) {
    return;
  }
  const sharing::record::Entry entry = request->GetSharingEntry();
  const sharing::record::Session visitor = request->GetSharingSession();
  const int64_t left = visitor.get_timeout() - time(nullptr);
  CallerSession session;
  session.username = userOf(visitor.get_owner_uid(), entry.get_owner_name());
  if (setenv(kCallerVariable, session.username.c_str(), 1) != 0) {
    unsetenv(kCallerVariable);
  }
  session.isAdmin =
      !session.username.empty() && QLIBGroupIsAdminGroupMem(session.username.c_str(), 0) == 1;
  session.isTimeout = left <= 0;
  session.timeout = std::max<int64_t>(left, 0);
  session.isSkipCheckIP = !entry.get_enable_match_ip();
  session.uiLang = QeloCgiGetLang(context_);
  session.app = entry.get_project_name();
  session.isAuthorized = !session.isTimeout && !session.username.empty();
  session.tokenEnable = QeloCgiIsTokenEnable(context_) != 0;
  Json::Value section = session.ToJson();
  section["appPriv"] = heldPrivilege(*request, session.username);
  request->InitSession(std::move(section));
}

}  // namespace QELO
