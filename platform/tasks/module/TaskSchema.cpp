#include "platform/tasks/module/TaskSchema.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <iterator>

#include "platform/base/Secrets.h"
#include "platform/tasks/module/Patience.h"
#include "webapi/base/Log.h"

namespace QELO::Platform {
namespace {

constexpr int kVersion = 1;  // of the tables below; 0 is what came before versions
constexpr int kLockTries = 100;
constexpr useconds_t kLockPauseUs = 10'000;
constexpr int kLargestText = 16 << 20;      // bytes of one property
constexpr char kCheckpointPages[] = "128";  // what one who opens the database reads at most

// Sorted by the objects' names, as the check reads them.
constexpr const char* kSchema[] = {
    "CREATE TABLE properties(task INTEGER NOT NULL, name TEXT NOT NULL, value BLOB NOT NULL,"
    " PRIMARY KEY(task, name)) WITHOUT ROWID",
    "CREATE TABLE removed(owner TEXT NOT NULL, task TEXT NOT NULL, time INTEGER NOT NULL,"
    " PRIMARY KEY(owner, task)) WITHOUT ROWID",
    "CREATE INDEX removed_by_time ON removed(time)",
    "CREATE TABLE tasks(id INTEGER PRIMARY KEY, owner TEXT NOT NULL, task TEXT NOT NULL,"
    " created INTEGER NOT NULL, born INTEGER NOT NULL, boot TEXT NOT NULL,"
    " pid INTEGER NOT NULL DEFAULT 0, start INTEGER NOT NULL DEFAULT 0,"
    " ending INTEGER NOT NULL DEFAULT 0, finished INTEGER, version INTEGER NOT NULL DEFAULT 1,"
    " changed INTEGER NOT NULL DEFAULT 0)",
    "CREATE INDEX tasks_ended ON tasks(finished) WHERE finished IS NOT NULL",
    "CREATE INDEX tasks_named ON tasks(owner, task, created)",  // all that a list reads
    "CREATE INDEX tasks_running ON tasks(created) WHERE finished IS NULL",
};

bool execute(sqlite3* database, const std::string& sql, std::string& error) {
  if (sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK) {
    return true;
  }
  error = sqlite3_errmsg(database);
  return false;
}

sqlite3* openFile(const std::string& path, std::string& error, bool& busy) {
  constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_NOFOLLOW;
  sqlite3* database = nullptr;
  if (sqlite3_open_v2(path.c_str(), &database, kFlags, Patience::FileSystem()) != SQLITE_OK) {
    error = database != nullptr ? sqlite3_errmsg(database) : "no memory";
    busy = database != nullptr && isHeldByOthers(database);
    sqlite3_close(database);
    return nullptr;
  }
  sqlite3_busy_timeout(database, kOwnStoreMs);  // less when Patience ends sooner
  sqlite3_limit(database, SQLITE_LIMIT_LENGTH, kLargestText);
  return database;
}

bool writeSchema(const std::string& path, std::string& error) {
  bool busy = false;
  sqlite3* database = openFile(path, error, busy);
  if (database == nullptr) {
    return false;
  }
  std::string sql = "BEGIN;";
  for (const char* statement : kSchema) {
    sql += std::string(statement) + ";";
  }
  // The journal mode stays with the file. Set last, it leaves nothing in companion files.
  const bool written = execute(
      database,
      sql + "PRAGMA user_version=" + std::to_string(kVersion) + "; COMMIT; PRAGMA journal_mode=WAL",
      error);
  sqlite3_close(database);
  return written;
}

/// Makes the database under another name and gives it its own when it is complete. Of several who
/// do so at once, the first one's stays.
bool makeDatabase(const StoreDirectory& directory, std::string& error) {
  const std::string name = "new." + makeSecret();
  {
    const UniqueFd file(openat(directory.Fd(), name.c_str(),
                               O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC,
                               S_IRUSR | S_IWUSR));
    if (!file) {
      error = strerror(errno);
      return false;
    }
  }
  bool made = writeSchema(directory.Path() + "/" + name, error);
  if (made && linkat(directory.Fd(), name.c_str(), directory.Fd(), kTaskDatabase, 0) != 0 &&
      errno != EEXIST) {
    error = strerror(errno);
    made = false;
  }
  for (const char* companion : {"", "-wal", "-shm", "-journal"}) {
    unlinkat(directory.Fd(), (name + companion).c_str(), 0);
  }
  return made;
}

/// A file that another made, or may write, could be made to harm its reader.
bool isSafeFile(const StoreDirectory& directory, uid_t store, bool& missing, std::string& error) {
  struct stat info {};
  if (fstatat(directory.Fd(), kTaskDatabase, &info, AT_SYMLINK_NOFOLLOW) != 0) {
    missing = errno == ENOENT;
    error = strerror(errno);
    return false;
  }
  if (!S_ISREG(info.st_mode) || info.st_uid != store || (info.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
    error = "the file is not the user's alone";
    return false;
  }
  return true;
}

bool hasOurSchema(sqlite3* database, std::string& error) {
  sqlite3_stmt* statement = nullptr;
  if (sqlite3_prepare_v2(database,
                         "SELECT sql FROM sqlite_schema WHERE sql IS NOT NULL ORDER BY name", -1,
                         &statement, nullptr) != SQLITE_OK) {
    error = sqlite3_errmsg(database);
    return false;
  }
  size_t matched = 0;
  int step = sqlite3_step(statement);
  for (; step == SQLITE_ROW; step = sqlite3_step(statement)) {
    const unsigned char* sql = sqlite3_column_text(statement, 0);
    if (matched == std::size(kSchema) || sql == nullptr ||
        strcmp(reinterpret_cast<const char*>(sql), kSchema[matched]) != 0) {
      break;
    }
    ++matched;
  }
  const bool same = step == SQLITE_DONE && matched == std::size(kSchema);
  if (!same) {
    error = step == SQLITE_DONE || step == SQLITE_ROW ? "the file holds other tables than ours"
                                                      : sqlite3_errmsg(database);
  }
  sqlite3_finalize(statement);
  return same;
}

/// The number that a query answers, -1 on failure.
int64_t ask(sqlite3* database, const char* sql) {
  sqlite3_stmt* statement = nullptr;
  int64_t number = -1;
  if (sqlite3_prepare_v2(database, sql, -1, &statement, nullptr) == SQLITE_OK &&
      sqlite3_step(statement) == SQLITE_ROW) {
    number = sqlite3_column_int64(statement, 0);
  }
  sqlite3_finalize(statement);
  return number;
}

/// Whether another version of this module has made it.
bool isOfAnotherVersion(sqlite3* database) {
  const int64_t version = ask(database, "PRAGMA user_version");
  return version >= 0 && version != kVersion &&
         ask(database,
             "SELECT count(*) FROM sqlite_schema"
             " WHERE type='table' AND name IN ('tasks','properties')") == 2;
}

/// Keeps others out while it lives. Its user might hold the lock for ever, so it is not waited for
/// for long. @return none, with errno, on failure
UniqueFd lockDirectory(const StoreDirectory& directory) {
  UniqueFd lock(open(directory.Path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  for (int tries = 0; lock && flock(lock.Get(), LOCK_EX | LOCK_NB) != 0; ++tries) {
    if (errno != EWOULDBLOCK || tries == kLockTries || Patience::Left() == 0) {
      return UniqueFd();
    }
    usleep(kLockPauseUs);
  }
  return lock;
}

/// Renames the database and what belongs to it. @return false with errno
bool renameToOld(int directory) {
  const std::string name = kTaskDatabase;
  for (const char* companion : {"", "-wal", "-shm"}) {  // a log must not meet another's database
    if (unlinkat(directory, (name + ".old" + companion).c_str(), 0) != 0 && errno != ENOENT) {
      return false;
    }
  }
  // The database last: until it is gone another process would do the same.
  for (const char* companion : {"-wal", "-shm", ""}) {
    const std::string old = name + ".old" + companion;
    if (renameat(directory, (name + companion).c_str(), directory, old.c_str()) != 0 &&
        (errno != ENOENT || *companion == '\0')) {
      return false;
    }
  }
  return true;
}

/// Sets a database that another version made aside. Another process may have done so at any moment
/// since the file was found, and what it leaves fails in many ways.
/// @param database  null when the file could not be opened
/// @return whether the file is gone from its name now
bool makeRoom(const StoreDirectory& directory, sqlite3* database, const DatabaseFile& file,
              std::string& error) {
  const UniqueFd lock = lockDirectory(directory);
  const int lockError = errno;
  const DatabaseFile now = findDatabaseFile(directory);
  if (lock && (!(now == file) || now == DatabaseFile{})) {
    return true;
  }
  if (database == nullptr || !isOfAnotherVersion(database)) {
    return false;
  }
  if (lock) {
    // So that the file is whole by itself. Not before it is known to be the one with this log.
    sqlite3_wal_checkpoint_v2(database, nullptr, SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr);
  }
  if (!lock || !renameToOld(directory.Fd())) {
    error = strerror(lock ? errno : lockError);
    return false;
  }
  WEBAPI_LOG("TaskModule.cpp",
             "another version made the task records %s/%s, which are kept as %s.old",
             directory.Path().c_str(), kTaskDatabase, kTaskDatabase);
  return true;
}

bool prepare(sqlite3* database, std::string& error) {
  sqlite3_db_config(database, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  // The tables are looked at once; code that is slipped in later must not run.
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  // The last one to leave would wait for the disk; who comes next finds the log as it is.
  sqlite3_db_config(database, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  return execute(database,
                 std::string("PRAGMA cell_size_check=1; PRAGMA temp_store=MEMORY;"
                             "PRAGMA synchronous=NORMAL; PRAGMA wal_autocheckpoint=") +
                     kCheckpointPages,
                 error) &&
         hasOurSchema(database, error);
}

/// @param again  receives whether the database was set aside, and there may be another
sqlite3* openOnce(const StoreDirectory& directory, uid_t store, bool create, TaskResult& result,
                  std::string& error, bool& again) {
  bool missing = false;
  bool busy = false;
  again = false;
  result = TaskResult::kFailed;
  if (!isSafeFile(directory, store, missing, error)) {
    if (!missing || !create || !makeDatabase(directory, error) ||
        !isSafeFile(directory, store, missing, error)) {
      result = missing && !create ? TaskResult::kMissing : TaskResult::kFailed;
      return nullptr;
    }
  }
  const DatabaseFile file = findDatabaseFile(directory);
  sqlite3* database = openFile(directory.Path() + "/" + kTaskDatabase, error, busy);
  if (database != nullptr && prepare(database, error)) {
    result = TaskResult::kDone;
    return database;
  }
  busy = busy || (database != nullptr && isHeldByOthers(database));
  // What is held cannot be told from another version's, and is none that was set aside meanwhile.
  again =
      busy ? !(findDatabaseFile(directory) == file) : makeRoom(directory, database, file, error);
  result = busy ? TaskResult::kBusy : TaskResult::kFailed;
  sqlite3_close(database);
  return nullptr;
}

}  // namespace

sqlite3* openTaskDatabase(const StoreDirectory& directory, uid_t store, bool create,
                          TaskResult& result, std::string& error) {
  bool again = false;
  sqlite3* database = openOnce(directory, store, create, result, error, again);
  return again ? openOnce(directory, store, create, result, error, again) : database;
}

DatabaseFile findDatabaseFile(const StoreDirectory& directory) {
  struct stat info {};
  return lstat((directory.Path() + "/" + kTaskDatabase).c_str(), &info) == 0
             ? DatabaseFile{info.st_dev, info.st_ino}
             : DatabaseFile{};
}

}  // namespace QELO::Platform
