#pragma once

#include <string>

namespace QELO::Platform {

/// Checks a password against the system's: with PAM on the host (HostPasswords.cpp), against the
/// shadow file in a private root (RootPasswords.cpp); the build takes one of them.
/// @param address  the client's, for PAM's records; "" when it is not known
/// @param name     receives the account's own spelling when the password is right
/// @return as QeloLoginPasswordCheck; that it cannot be checked is logged
int checkPassword(const std::string& account, const std::string& password,
                  const std::string& address, std::string& name);

}  // namespace QELO::Platform
