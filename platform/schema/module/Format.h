#pragma once

#include <string_view>

namespace QELO::Platform {

/// Whether a text is of a format: "date", "time" and "date-time" (RFC 3339), "email", "hostname",
/// "ipv4", "ipv6", "uuid". Of any other format every text is.
bool isOfFormat(std::string_view format, std::string_view text);

}  // namespace QELO::Platform
