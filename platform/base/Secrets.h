#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace QELO::Platform {

/// Characters of a secret: 32 random bytes as base64url without padding.
inline constexpr size_t kSecretLength = 43;

/// @return an empty text when the kernel gives no random bytes
std::string makeSecret();

/// Whether a client's text has a secret's length and alphabet, so that it may become a file name.
bool isSecretText(std::string_view text);

/// Compares in a time that depends on the lengths alone.
bool equalSecrets(std::string_view left, std::string_view right);

}  // namespace QELO::Platform
