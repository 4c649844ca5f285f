#pragma once

#include "webapi/platform/Paths.h"

/// What the embedded platform keeps below the system's root, next to the paths that the library
/// knows too.
namespace QELO::Paths {

/// For paths that come from a setting or from the account database.
inline constexpr char kRootPrefix[] = WEBAPI_ROOT_PREFIX;

inline constexpr char kRuntimeDir[] = WEBAPI_ROOT_PREFIX "/run/webapi";
inline constexpr char kSessionDir[] = WEBAPI_ROOT_PREFIX "/run/webapi/sessions";
inline constexpr char kLoginDir[] = WEBAPI_ROOT_PREFIX "/run/webapi/logins";
inline constexpr char kStateDir[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi";
inline constexpr char kTokenDatabase[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi/tokens.db";
inline constexpr char kSliceDir[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi/uploads";
inline constexpr char kSharingDatabase[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi/sharing.db";
inline constexpr char kTaskDir[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi/tasks";
inline constexpr char kGroupPreferenceDir[] = WEBAPI_ROOT_PREFIX "/var/lib/webapi/groups";
inline constexpr char kAppPrivileges[] = WEBAPI_ROOT_PREFIX "/etc/webapi/appprivs.json";
inline constexpr char kMimeTypes[] = WEBAPI_ROOT_PREFIX "/etc/mime.types";
inline constexpr char kCipherDir[] = WEBAPI_ROOT_PREFIX "/run/webapi/ciphers";
inline constexpr char kCipherKey[] = WEBAPI_ROOT_PREFIX "/etc/webapi/cipher.pem";
inline constexpr char kRelayHosts[] = WEBAPI_ROOT_PREFIX "/etc/webapi/relay.json";
inline constexpr char kPasswd[] = WEBAPI_ROOT_PREFIX "/etc/passwd";
inline constexpr char kGroup[] = WEBAPI_ROOT_PREFIX "/etc/group";
inline constexpr char kShadow[] = WEBAPI_ROOT_PREFIX "/etc/shadow";

}  // namespace QELO::Paths
