#include "platform/base/module/OwnDatabase.h"

#include "webapi/base/OwnFile.h"

namespace QELO::Platform {

bool openOwnDatabase(const char* path, int busyMs, sqlite3*& database, std::string& error) {
  if (OthersMayChange(path)) {
    error = "others may write it or its directory";
    return false;
  }
  if (sqlite3_open_v2(path, &database, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr) !=
      SQLITE_OK) {
    error = sqlite3_errmsg(database);
    return false;
  }
  sqlite3_busy_timeout(database, busyMs);
  int keep = 1;
  sqlite3_file_control(database, "main", SQLITE_FCNTL_PERSIST_WAL, &keep);
  return true;
}

}  // namespace QELO::Platform
