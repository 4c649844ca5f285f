#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRequest.h"

struct QeloCgiContext;

namespace QELO {

class APIResponse;
class APIRunner;
struct CallName;

/// Who calls, and whether that user may run a method. The operations are WebEntry's of the same
/// name.
class PermissionCheck {
 public:
  /// @param runner      knows the methods' attributes
  /// @param caller      the process's own request, whose session the check fills
  /// @param context     the CGI library's, initialised with the caller's cookies
  /// @param permission  what has been found so far: an object with "permResult" (array)
  PermissionCheck(APIRunner& runner, APIRequest& caller, QeloCgiContext* context,
                  Json::Value& permission)
      : runner_(runner), caller_(caller), context_(context), permission_(permission) {}
  PermissionCheck(const PermissionCheck&) = delete;
  PermissionCheck& operator=(const PermissionCheck&) = delete;

  static bool NeedPermission(APIRequest* request);
  static bool SkipPermission(APIRequest* request);
  bool CheckPermission(APIRequest* request, APIResponse* response);
  int CheckPermission(bool allowTimeout);
  /// Whether the last check let the caller in by an access token.
  bool CameByToken() const { return now_ != nullptr && now_->byToken; }

 private:
  /// What was found with an allowance, so that the caller's request can hold it again.
  struct Finding {
    Json::Value session;
    std::string sessionId;
    bool byToken = false;  ///< an access token stands in for the session
  };

  static unsigned SlotOf(bool allowTimeout) { return allowTimeout ? 0 : 1; }
  const Json::Value& KnownResult(unsigned slot) const;
  void TurnTo(unsigned slot);
  int Authorise(bool allowTimeout);
  void FillSession(const std::string& user, const std::string& language, bool isAuthorized);
  bool CoversInnerCall(const APIRequest& request, const Finding& finding);
  bool KeepsIdle(const CallName& call);
  int ResultOf(const APIRequest& request, bool allowTimeout);
  bool RefuseSession(APIRequest& request, APIResponse& response, _tag_authorized_result_ result);
  bool Refuse(APIRequest& request, APIResponse& response, int code, const std::string& reason);
  bool PassesUserChecks(APIRequest& request, APIResponse& response, const CallName& call,
                        const Json::Value& appPriv);

  APIRunner& runner_;
  APIRequest& caller_;
  QeloCgiContext* context_;
  Json::Value& permission_;
  Finding findings_[2];
  Finding unchecked_;       ///< the caller's request as it came
  Finding* now_ = nullptr;  ///< what the caller's request holds; null: as it came
};

}  // namespace QELO
