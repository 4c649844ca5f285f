#pragma once

#include <json/json.h>

#include <string>

struct QeloCgiContext;

namespace QELO {

class APIRequest;
class APIResponse;
class APIRunner;

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

  static bool NeedPermission(APIRequest* request);
  static bool SkipPermission(APIRequest* request);
  bool CheckPermission(APIRequest* request, APIResponse* response);
  int CheckPermission(bool allowTimeout);

 private:
  const Json::Value& KnownResult(bool allowTimeout) const;
  int Authorise(bool allowTimeout);
  void FillSession(const std::string& user, const std::string& language, bool isAuthorized);
  bool CoversInnerCall(const APIRequest& request);
  bool KeepsIdle();
  bool IsAllowedUser(APIRequest* request);

  APIRunner& runner_;
  APIRequest& caller_;
  QeloCgiContext* context_;
  Json::Value& permission_;
};

}  // namespace QELO
