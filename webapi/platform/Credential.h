#pragma once

#include <string>

#include "webapi/Export.h"

/// The host's credential library.

/// Switches the process's user, group and supplementary groups to a user's.
/// @param keepPrivilege  the saved ids stay as they are, so that the caller can switch back
/// @return false when there is no such user or the switch is refused; group and user ids are then
///         as they were
WEBAPI_API bool ResetCredentialsByName(const char* name, bool keepPrivilege);

/// Switches to the user whom a file belongs to, as ResetCredentialsByName() does: its code then
/// does nothing that this user could not do anyway.
/// @return false when there is no such file, others than its owner and root may change it, or its
///         owner is no user of the host (logged)
WEBAPI_API bool InitCredentialsByExecutable(const char* path, bool keepPrivilege);

namespace QELO::CredRequestUtil {

/// Deciphers AES text. @return false on failure
WEBAPI_API bool GetDecryptAESString(const std::string& key, const std::string& cipher,
                                    std::string& plain);

}  // namespace QELO::CredRequestUtil
