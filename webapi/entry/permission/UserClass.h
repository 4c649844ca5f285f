#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

class APIRequest;

/// Bytes of a login name with its NUL, as the CGI library fills it in.
inline constexpr int kUserNameSize = 493;

/// Whether an "allowUser" list names a user class; a list that is missing or empty names none.
bool ListsUserClass(const Json::Value& allowUser, const std::string& userClass);

/// Who must be logged in for an API, from its description's "authLevel". A level that is missing
/// or no integer, be it the text "0" or false, asks for a login.
enum AuthLevel : int { AUTH_NONE = 0, AUTH_LOGIN = 1, AUTH_SKIP = 2 };
int AuthLevelOf(const Json::Value& level);

/// Whether a user may call an API that has this "appPriv". Missing, null or empty it asks for
/// nothing; one that is no text names no privilege, and nobody may call.
bool HoldsAppPriv(const Json::Value& appPriv, const std::string& user, const std::string& address);

}  // namespace QELO
