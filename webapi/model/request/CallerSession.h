#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

/// The session of somebody for whom a program answers, as a request takes it: logged in, not timed
/// out, an administrator when the host's accounts say so.
Json::Value makeUserSession(const std::string& user);

}  // namespace QELO
