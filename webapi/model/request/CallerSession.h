#pragma once

#include <json/json.h>

#include <cstdint>
#include <string>

namespace QELO {

class APIRequest;

/// Tells other programs of the system whom the process works for.
inline constexpr char kCallerVariable[] = "QELO_WEBAPI_USERNAME";

/// What is known of the one for whom a call is made: the "session" section of a request's record,
/// whose members have these names.
struct CallerSession {
  std::string username;  ///< login name; "": nobody
  bool isAdmin = false;
  std::string sessFile;        ///< where the session is kept
  bool isTimeout = false;      ///< idle for too long, and accepted where the method allows it
  int64_t timeout = 0;         ///< seconds left
  bool isSkipCheckIP = false;  ///< not bound to the client's address
  std::string uiLang;
  std::string app;
  std::string webapi;
  bool isAuthorized = false;
  bool tokenEnable = false;  ///< sessions that come by cookie need their anti-forgery token

  /// As the request's getters tell it.
  static CallerSession Of(const APIRequest& request);
  /// The section with all members.
  Json::Value ToJson() const;

  /// The section of somebody for whom a program answers: logged in, not timed out, an administrator
  /// when the host's accounts say so. What a client alone has is not in it.
  static Json::Value OfUser(const std::string& user);
  /// The section with nobody in it: what the request came with before anybody was asked.
  static Json::Value OfNobody(const APIRequest& request);
};

}  // namespace QELO
