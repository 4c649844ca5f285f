#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>

/// The form of a task's id: a prefix, a secret, a dot and the user whose store holds the record, in
/// decimal: "backup_" "jnW...43 characters" ".1002".
namespace QELO::Platform {

inline constexpr size_t kTaskPrefixLength = 128;  ///< longest prefix, characters

/// Letters, digits, '.', '_' and '-', not too many.
bool isTaskPrefix(std::string_view prefix);

/// @return "" when the kernel gives no random bytes
std::string makeTaskId(std::string_view prefix, uid_t store);

/// Tells the store of an id that a client sent.
/// @return false, and `store` unchanged, when the text is no id
bool readTaskId(std::string_view id, uid_t& store);

/// A user id as a store's directory has it for a name: decimal, without leading zeros.
/// @return false, and `store` unchanged, when the text is something else
bool readStoreName(std::string_view name, uid_t& store);

}  // namespace QELO::Platform
