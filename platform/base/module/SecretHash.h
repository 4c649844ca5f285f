#pragma once

#include <string>
#include <string_view>

namespace QELO::Platform {

/// The SHA-256 of a secret, 32 bytes.
std::string secretHash(std::string_view secret);

}  // namespace QELO::Platform
