#pragma once

#include <json/json.h>

#include <string>

namespace QELO::Platform {

/// Longest line of a call in bytes: what the other host takes as a body at most.
inline constexpr size_t kLongestCall = size_t{16} << 20;
/// The same where it stands in the address, as an upload's: web servers take no longer ones.
inline constexpr size_t kLongestQuery = 6000;

/// A call as a parameter line. Each value is written as JSON, so that the other host reads what
/// stood here, a text that looks like a number too. Credentials among the parameters are left out:
/// they are this host's.
/// @param limit  bytes
/// @return false, with a part of the line, when it is longer
bool writeCall(const std::string& api, int version, const std::string& method,
               const Json::Value& params, size_t limit, std::string& line);

}  // namespace QELO::Platform
