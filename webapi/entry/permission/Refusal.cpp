#include "webapi/entry/permission/Refusal.h"

#include "webapi/base/Log.h"

namespace QELO {

const char* RefusalReason(_tag_authorized_result_ result, bool hasToken) {
  switch (result) {
    case AUTHORIZED_TIMED_OUT:
      return "the session has timed out";
    case AUTHORIZED_NO_SESSION:
      return "not logged in";
    case AUTHORIZED_BROKEN:
      return "the session cannot be read";
    case AUTHORIZED_UNKNOWN:
      return "what was sent is no session id";
    case AUTHORIZED_UNAUTHENTICATED:
      return hasToken ? "the access token is unknown, has expired or is for other calls"
                      : "no such session, or its account is gone";
    case AUTHORIZED_TOKEN_MISMATCH:
      return "the anti-forgery token is missing or wrong";
    case AUTHORIZED_ADDRESS_MISMATCH:
      return "the session is bound to another address";
    default:
      return "the session's account may not come in";
  }
}

void LogRefusal(const APIRequest& caller, const std::string& reason) {
  const std::string client = caller.GetRemoteIP();
  syslog(LOG_AUTH | LOG_NOTICE, "%s:%d call refused from %s: %s; account [%s]", "WebEntry.cpp",
         __LINE__, LogText(client.empty() ? "unknown" : client).c_str(), LogText(reason).c_str(),
         LogText(caller.GetLoginUserName()).c_str());
}

}  // namespace QELO
