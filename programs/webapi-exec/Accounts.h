#pragma once

#include <json/json.h>

#include <string>
#include <vector>

namespace QELO::ExecProgram {

/// The accounts of a private root that people log in to and this process may call as. None on the
/// host itself, which may have thousands.
std::vector<std::string> callableUsers();

/// Why a call of this API, version and method, as this user, cannot get the account that it runs
/// as.
/// @return "" when it can, or when there is no such method
std::string missingRights(const std::string& api, int version, const std::string& method,
                          const std::string& user);

}  // namespace QELO::ExecProgram
