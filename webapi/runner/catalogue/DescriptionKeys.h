#pragma once

#include <cstdint>
#include <string_view>

/// The keys of descriptions that the framework reads, with the types that it expects: the one list
/// of them, for what checks and compares descriptions.
namespace QELO::DescriptionKeys {

enum class Type : uint8_t {
  kText,
  kTextOrNull,
  kInteger,
  kBoolean,
  kList,
  kObject,
  kSchema,  ///< a JSON Schema, draft 7
  kAny,
};

struct Key {
  std::string_view name;
  Type type;
};

/// Members of an API. An API may have others for itself (APIRequest::GetAPIInfo).
inline constexpr Key kMembers[] = {
    {"lib", Type::kText},
    {"minVersion", Type::kInteger},
    {"maxVersion", Type::kInteger},
    {"methods", Type::kObject},
    {"authLevel", Type::kInteger},
    {"allowUser", Type::kList},
    {"appPriv", Type::kTextOrNull},
    {"runAs", Type::kText},
    {"priority", Type::kInteger},
    {"count", Type::kBoolean},
    {"requestFormat", Type::kText},
    {"socket", Type::kText},
    {"disableSocket", Type::kBoolean},
};

/// Attributes of a method.
inline constexpr Key kAttributes[] = {
    {"runAs", Type::kText},
    {"grantByUser", Type::kBoolean},
    {"grantByDefault", Type::kBoolean},
    {"grantable", Type::kBoolean},
    {"allowUser", Type::kList},
    {"allowTimeout", Type::kBoolean},
    {"skipCheckIP", Type::kBoolean},
    {"keepIdle", Type::kBoolean},
    {"readOnly", Type::kBoolean},
    {"allowDownload", Type::kBoolean},
    {"allowUpload", Type::kBoolean},
    {"deferUpload", Type::kBoolean},
    {"allowDemo", Type::kBoolean},
    {"disableSocket", Type::kBoolean},
    {"allowSharing", Type::kBoolean},
    {"skipSharingAppCheck", Type::kBoolean},
    {"isolation", Type::kText},
    {"summary", Type::kText},
    {"description", Type::kText},
    {"params", Type::kSchema},
    {"returns", Type::kSchema},
    {"errors", Type::kObject},
    {"example", Type::kObject},
};

/// Members of lib.def; its "methods" are attributes.
inline constexpr Key kDefaults[] = {
    {"authLevel", Type::kInteger},
    {"allowUser", Type::kList},
    {"priority", Type::kInteger},
    {"methods", Type::kObject},
};

/// What "allowUser" may list.
inline constexpr std::string_view kUserClasses[] = {
    "admin.local", "admin.domain", "admin.ldap", "normal.local", "normal.domain", "normal.ldap",
};

/// What "isolation" may be.
inline constexpr std::string_view kIsolations[] = {"process", "worker"};

inline constexpr int kMaxPriority = 10;  ///< of "priority", and below 0 its opposite

}  // namespace QELO::DescriptionKeys
