#pragma once

#include <json/json.h>

#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIRequest;
class APIResponse;

/// Permission checks for callers other than the web entry.
class WEBAPI_API APIAuth {
 public:
  /// Whether the API's "allowUser" (its description's, not a method's) names the class of `user`,
  /// who counts as an administrator when the request's caller is one.
  /// @return false also when the list is missing or empty, or `user` is null or empty
  static bool CheckAllowUser(APIRequest* request, const char* user);

  /// Checks a login session, the user class and the application privilege, for a program that was
  /// started for one request.
  ///
  /// The CGI library checks the session of the process's own cookies. So `session` must be the one
  /// that they name (the last "id" in HTTP_COOKIE), and the request's; another one is refused with
  /// 105. The session's address binding is always checked.
  /// @param session       session id; null is refused with 105
  /// @param allowTimeout  whether a timed-out session is accepted
  /// @return false with error 105, 106, 107, 150 or 160 set on the response; true with the
  ///         response as it was. The request stays as it was.
  static bool CheckPermission(APIRequest* request, APIResponse* response, const char* session,
                              bool allowTimeout);

  /// Counts now as the last use of the request's session, so that its idle limit begins anew.
  /// @return false when there is none, or it has timed out, which nothing revives
  static bool UpdateTimeout(APIRequest* request);

  /// "admin." or "normal.", followed by "domain" for a name with a backslash, "ldap" for one with
  /// "@", else "local".
  static std::string GetUserClass(bool isAdmin, const std::string& user);

  /// Whether the request's caller may call a method, by the rules of the web entry: login needed,
  /// user class, application privilege. The caller must have been checked before.
  /// @param description  the API's description
  /// @param attributes   the method's attributes
  static bool MayCall(const APIRequest& request, const Json::Value& description,
                      const Json::Value& attributes);
};

}  // namespace QELO
