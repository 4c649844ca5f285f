#include "tests/unit/platform/sharing/Fixture.h"

#include <sqlite3.h>

void SharingLinks::Execute(const std::string& sql) {
  sqlite3* database = nullptr;
  ASSERT_EQ(sqlite3_open(Path(kDatabase).c_str(), &database), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  sqlite3_close(database);
}
