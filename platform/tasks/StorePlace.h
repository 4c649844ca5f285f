#pragma once

#include <sys/types.h>

namespace QELO::Platform {

/// Makes the directory of a user's task records when it is missing: everybody may make directories
/// there, and one that a stranger made first would keep the user from having tasks. Such a one is
/// set aside (logged). Does something in root's processes alone.
void reserveTaskStore(uid_t user, gid_t group);

}  // namespace QELO::Platform
