#pragma once

/// Every absolute path below the system's root, joined to one prefix. The prefix is fixed when
/// the library is built: empty for the host itself, a private root for development and tests.
/// Nothing at run time changes it, since the programs may run with more rights than their caller.
#ifndef WEBAPI_ROOT_PREFIX
#error "WEBAPI_ROOT_PREFIX must be defined by the build"
#endif

namespace QELO::Paths {

inline constexpr char kDescriptionDir[] = WEBAPI_ROOT_PREFIX "/usr/qelo/qeloman/webapi/";
inline constexpr char kLibDef[] = WEBAPI_ROOT_PREFIX "/usr/qelo/qeloman/webapi/lib.def";
inline constexpr char kSystemInfo[] = WEBAPI_ROOT_PREFIX "/etc/qeloinfo.conf";
inline constexpr char kSystemInfoDefaults[] = WEBAPI_ROOT_PREFIX "/etc.defaults/qeloinfo.conf";
inline constexpr char kRoot[] = WEBAPI_ROOT_PREFIX "/";
inline constexpr char kTmp[] = WEBAPI_ROOT_PREFIX "/tmp";
inline constexpr char kVarTmp[] = WEBAPI_ROOT_PREFIX "/var/tmp";
inline constexpr char kSharingCheckDir[] = WEBAPI_ROOT_PREFIX "/usr/lib/sharing/permission_lib/";
inline constexpr char kCounterDir[] = WEBAPI_ROOT_PREFIX "/var/spool/webapi";

}  // namespace QELO::Paths
