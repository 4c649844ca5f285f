#include "platform/base/module/OwnDatabase.h"

#include "webapi/base/OwnFile.h"

namespace QELO::Platform {

bool openOwnDatabase(const char* path, sqlite3*& database, std::string& error) {
  if (OthersMayChange(path)) {
    error = "others may write it or its directory";
    return false;
  }
  if (sqlite3_open_v2(path, &database, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr) !=
      SQLITE_OK) {
    error = sqlite3_errmsg(database);
    return false;
  }
  sqlite3_busy_timeout(database, kDatabasePatienceMs);
  int keep = 1;
  sqlite3_file_control(database, "main", SQLITE_FCNTL_PERSIST_WAL, &keep);
  sqlite3_db_config(database, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  return true;
}

void emptyDatabaseLogAtClose(sqlite3* database) {
  sqlite3_exec(database, "PRAGMA journal_size_limit=0", nullptr, nullptr, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 0, nullptr);
}

void emptyDatabaseLog(sqlite3* database) {
  sqlite3_busy_timeout(database, 0);
  sqlite3_wal_checkpoint_v2(database, nullptr, SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr);
  sqlite3_busy_timeout(database, kDatabasePatienceMs);
}

}  // namespace QELO::Platform
