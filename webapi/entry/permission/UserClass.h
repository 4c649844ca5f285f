#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

class APIRequest;

/// Bytes of a login name with its NUL, as the CGI library fills it in.
inline constexpr int kUserNameSize = 493;

/// Whether an "allowUser" list names a user class; a list that is missing or empty names none.
bool ListsUserClass(const Json::Value& allowUser, const std::string& userClass);

/// Whether a user may call an API that has this "appPriv". Missing, null or empty it asks for
/// nothing; one that is no text names no privilege, and nobody may call.
bool HoldsAppPriv(const Json::Value& appPriv, const std::string& user, const std::string& address);

}  // namespace QELO
