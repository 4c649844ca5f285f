#pragma once

#include <sys/types.h>

#include <string>

struct sqlite3;

namespace QELO::Platform {

/// The form of the token database.
class TokenSchema {
 public:
  explicit TokenSchema(sqlite3* database) : database_(database) {}

  /// Brings the tables to today's form; creates them first when `create` says so.
  /// @param findUid  the id of an account's user, for a database of the first version
  /// @param error    receives what went wrong
  /// @return false on failure; the database is then as it was
  bool Bring(bool create, uid_t (*findUid)(const char* user), std::string& error);

 private:
  bool ReadVersion(int& version);
  bool Upgrade(int version, bool create, uid_t (*findUid)(const char* user));
  bool AddOwners(uid_t (*findUid)(const char* user));
  bool Execute(const char* sql);

  sqlite3* database_;
};

}  // namespace QELO::Platform
