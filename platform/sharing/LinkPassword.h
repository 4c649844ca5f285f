#pragma once

#include <string>

namespace QELO::Platform {

/// @return the password as crypt(3) hashes it; "" when it cannot, which is logged
std::string hashLinkPassword(const std::string& password);

/// Whether it is the password. Takes as long for each that is not.
/// @return 1 yes, 0 no, -1 when that cannot be told, which is logged
int checkLinkPassword(const std::string& hash, const std::string& password);

}  // namespace QELO::Platform
