#pragma once

#include <string>

namespace QELO::Platform {

/// Checks a password against the system's: with PAM on the host (HostPasswords.cpp), against the
/// shadow file in a private root (RootPasswords.cpp); the build takes one of them.
/// @param name  receives the account's own spelling when the result is 1
/// @return 1 right; 0 wrong, unknown, barred or expired; -1 cannot be checked, which is logged
int checkPassword(const std::string& account, const std::string& password, std::string& name);

}  // namespace QELO::Platform
