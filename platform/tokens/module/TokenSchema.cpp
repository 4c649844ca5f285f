#include "platform/tokens/module/TokenSchema.h"

#include <sqlite3.h>

#include <memory>

#include "platform/base/module/OwnDatabase.h"

namespace QELO::Platform {
namespace {

constexpr int kVersion = 2;
constexpr char kFirstTables[] =
    "CREATE TABLE IF NOT EXISTS tokens("
    "id INTEGER PRIMARY KEY AUTOINCREMENT, hash BLOB NOT NULL UNIQUE, user TEXT NOT NULL,"
    "api TEXT NOT NULL, method TEXT NOT NULL, created INTEGER NOT NULL, expires INTEGER NOT NULL)";
constexpr char kOwnerColumns[] =
    "ALTER TABLE tokens ADD COLUMN uid INTEGER NOT NULL DEFAULT 4294967295;"
    "ALTER TABLE tokens ADD COLUMN service INTEGER NOT NULL DEFAULT 0";
constexpr char kScopes[] =
    "CREATE TABLE scopes(token INTEGER NOT NULL, api TEXT NOT NULL, method TEXT NOT NULL,"
    "PRIMARY KEY(token, api, method)) WITHOUT ROWID;"
    "INSERT INTO scopes SELECT id, api, method FROM tokens;"
    "ALTER TABLE tokens DROP COLUMN api;"
    "ALTER TABLE tokens DROP COLUMN method;"
    "ALTER TABLE tokens ADD COLUMN name TEXT NOT NULL DEFAULT '';"
    "ALTER TABLE tokens ADD COLUMN readonly INTEGER NOT NULL DEFAULT 0;"
    "ALTER TABLE tokens ADD COLUMN address TEXT NOT NULL DEFAULT '';"
    "ALTER TABLE tokens ADD COLUMN used INTEGER NOT NULL DEFAULT 0";

struct Finalize {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};

/// Null on failure.
std::unique_ptr<sqlite3_stmt, Finalize> prepare(sqlite3* database, const char* sql) {
  sqlite3_stmt* statement = nullptr;
  sqlite3_prepare_v2(database, sql, -1, &statement, nullptr);
  return std::unique_ptr<sqlite3_stmt, Finalize>(statement);
}

}  // namespace

bool TokenSchema::Bring(bool create, uid_t (*findUid)(const char* user), std::string& error) {
  int version = 0;
  bool done = ReadVersion(version);
  if (done && version < kVersion) {
    // Another process may do it while this one waits.
    done = (!create || Execute("PRAGMA journal_mode=WAL")) && Execute("BEGIN IMMEDIATE");
    if (done &&
        !(ReadVersion(version) && (version >= kVersion || Upgrade(version, create, findUid)) &&
          Execute("COMMIT"))) {
      error = sqlite3_errmsg(database_);
      Execute("ROLLBACK");
      return false;
    }
    if (done) {
      emptyDatabaseLogAtClose(database_);
    }
  }
  error = !done                ? sqlite3_errmsg(database_)
          : version > kVersion ? "made by a later version of this program"
                               : "";
  return error.empty();
}

bool TokenSchema::ReadVersion(int& version) {
  const auto statement = prepare(database_, "PRAGMA user_version");
  if (statement == nullptr || sqlite3_step(statement.get()) != SQLITE_ROW) {
    return false;
  }
  version = sqlite3_column_int(statement.get(), 0);
  return true;
}

bool TokenSchema::Upgrade(int version, bool create, uid_t (*findUid)(const char* user)) {
  if (version == 0 &&
      !((!create || Execute(kFirstTables)) && Execute(kOwnerColumns) && AddOwners(findUid))) {
    return false;
  }
  return Execute(kScopes) && Execute("PRAGMA user_version=2");
}

bool TokenSchema::AddOwners(uid_t (*findUid)(const char* user)) {
  const auto users = prepare(database_, "SELECT DISTINCT user FROM tokens");
  const auto update = prepare(database_, "UPDATE tokens SET uid = ?1 WHERE user = ?2");
  if (users == nullptr || update == nullptr) {
    return false;
  }
  int step = sqlite3_step(users.get());
  for (; step == SQLITE_ROW; step = sqlite3_step(users.get())) {
    const auto* user = reinterpret_cast<const char*>(sqlite3_column_text(users.get(), 0));
    sqlite3_bind_int64(update.get(), 1, findUid(user != nullptr ? user : ""));
    sqlite3_bind_text(update.get(), 2, user, -1, SQLITE_TRANSIENT);
    if (sqlite3_step(update.get()) != SQLITE_DONE) {
      return false;
    }
    sqlite3_reset(update.get());
  }
  return step == SQLITE_DONE;
}

bool TokenSchema::Execute(const char* sql) {
  return sqlite3_exec(database_, sql, nullptr, nullptr, nullptr) == SQLITE_OK;
}

}  // namespace QELO::Platform
