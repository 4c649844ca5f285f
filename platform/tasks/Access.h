#pragma once

#include <string>
#include <vector>

#include "platform/tasks/module/TaskModule.h"

/// Which records the process may reach, and the module that holds them.
namespace QELO::Platform {

/// The stores, from the module that is loaded by the first call. @return null on failure (logged)
TaskStores* openTaskStores();

/// Names the record that a client asks for.
/// @return false, and `key` unchanged, when owner or id cannot be one, or the effective user may
///         not reach that store: everybody may reach his own, root all
bool makeTaskKey(const std::string& owner, const std::string& id, TaskKey& key);

/// Whether a user's store may hold tasks of this owner. What a user's processes write there, that
/// user may forge: it counts for the user, for everybody, and with an administrator for the
/// administrators. Accounts that nobody logs in to do work for others.
bool mayHoldTasksOf(uid_t store, const std::string& owner);

}  // namespace QELO::Platform
