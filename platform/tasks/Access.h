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

/// What a user's store counts for when tasks of an owner are asked for.
enum class Standing {
  kNothing,  ///< it may hold none of them
  kShared,   ///< it may hold what is everybody's or the administrators'; nobody waits for it for
             ///< long
  kOwn       ///< it is the process's own, the owner's or that of the account that methods run as
};

/// What a user's processes write to the user's store, that user may forge: it counts for the user,
/// for everybody, and with an administrator for the administrators. The account "system" alone does
/// work for others.
Standing standingOf(uid_t store, const std::string& owner);

/// How long to wait for a store, in milliseconds.
int patienceWith(Standing standing);

}  // namespace QELO::Platform
