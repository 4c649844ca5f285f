#pragma once

#include <sqlite3.h>

#include <string>

#include "platform/tasks/module/StoreDirectory.h"
#include "platform/tasks/module/TaskModule.h"

namespace QELO::Platform {

/// Name of the database in a store's directory.
inline constexpr char kTaskDatabase[] = "tasks.db";

/// Opens the database of a store with all that makes it safe to use: the file must be a plain one
/// of the user's alone, and hold our tables as we made them and nothing else.
/// A database of another version of this module is set aside, as kTaskDatabase and ".old" (logged),
/// in place of one that was before; then there is none.
/// @param create   makes the database when missing; it appears complete or not at all
/// Waits for others as long as the Patience that lives allows.
/// @param result  receives kDone, or why there is none: kMissing, kBusy or kFailed
/// @return null on failure, with the reason in `error`
sqlite3* openTaskDatabase(const StoreDirectory& directory, uid_t store, bool create,
                          TaskResult& result, std::string& error);

/// Which file has the database's path now; two that are equal are one file.
struct DatabaseFile {
  dev_t device = 0;
  ino_t inode = 0;
  bool operator==(const DatabaseFile&) const = default;
};
DatabaseFile findDatabaseFile(const StoreDirectory& directory);

}  // namespace QELO::Platform
