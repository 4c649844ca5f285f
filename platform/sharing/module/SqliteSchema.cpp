// Opening the database, and its tables.

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "platform/base/module/OwnDatabase.h"
#include "platform/base/module/Statement.h"
#include "platform/sharing/module/SqliteLinkStore.h"
#include "platform/sharing/module/Transaction.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr int kVersion = 1;
/// Numbers of links and sessions are never given twice: what points to one that is gone points to
/// nothing.
constexpr char kTables[] =
    "CREATE TABLE links("
    "id INTEGER PRIMARY KEY AUTOINCREMENT, hash BLOB NOT NULL UNIQUE, owner TEXT NOT NULL,"
    "uid INTEGER NOT NULL, project TEXT NOT NULL, name TEXT NOT NULL, path TEXT NOT NULL,"
    "protect INTEGER NOT NULL, match_address INTEGER NOT NULL, upload INTEGER NOT NULL,"
    "password TEXT NOT NULL, created INTEGER NOT NULL, expires INTEGER NOT NULL,"
    "max_uses INTEGER NOT NULL, uses INTEGER NOT NULL, max_bytes INTEGER NOT NULL);"
    "CREATE INDEX links_of_owner ON links(uid);"
    "CREATE TABLE sessions("
    "id INTEGER PRIMARY KEY AUTOINCREMENT, hash BLOB NOT NULL UNIQUE, uid INTEGER NOT NULL,"
    "address TEXT NOT NULL, ends INTEGER NOT NULL);"
    "CREATE INDEX sessions_by_end ON sessions(ends);"
    "CREATE TABLE tokens("
    "session INTEGER NOT NULL, link INTEGER NOT NULL, opened INTEGER NOT NULL,"
    "PRIMARY KEY(session, link)) WITHOUT ROWID;"
    "CREATE INDEX tokens_of_link ON tokens(link);"
    "PRAGMA user_version=1";

}  // namespace

SqliteLinkStore::~SqliteLinkStore() {
  for (const auto& [sql, statement] : statements_) {
    sqlite3_finalize(statement);
  }
  sqlite3_close(database_);
}

bool SqliteLinkStore::Open(const char* path, bool create) {
  struct stat info {};
  if (stat(path, &info) != 0 && (errno != ENOENT || !create || !MakeFile(path))) {
    error_ = strerror(errno);
    return false;
  }
  if (!openOwnDatabase(path, database_, error_)) {
    return false;
  }
  int64_t version = 0;
  if (!ReadVersion(version)) {
    return false;
  }
  if (version > kVersion) {
    error_ = "made by a later version of this program";
    return false;
  }
  return version == kVersion || Upgrade();
}

bool SqliteLinkStore::MakeFile(const char* path) {
  // Ours alone from its first moment; SQLite gives its companion files the same mode.
  return static_cast<bool>(
      UniqueFd(open(path, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR)));
}

bool SqliteLinkStore::ReadVersion(int64_t& version) {
  Statement statement(Prepare("PRAGMA user_version"));
  if (!statement.Row()) {
    return Fail();
  }
  version = statement.NumberAt(0);
  return true;
}

bool SqliteLinkStore::Upgrade() {
  if (!Execute("PRAGMA journal_mode=WAL")) {
    return false;
  }
  Transaction transaction(*this);
  int64_t version = 0;
  if (!transaction.Begun() || !ReadVersion(version)) {
    return Fail();
  }
  // Another process may have done it while this one waited.
  return version == kVersion || (Execute(kTables) && (transaction.Commit() || Fail()));
}

sqlite3_stmt* SqliteLinkStore::Prepare(const char* sql) {
  sqlite3_stmt*& statement = statements_[sql];
  if (statement == nullptr &&
      sqlite3_prepare_v2(database_, sql, -1, &statement, nullptr) != SQLITE_OK) {
    Fail();
  }
  return statement;
}

bool SqliteLinkStore::Execute(const char* sql) {
  return sqlite3_exec(database_, sql, nullptr, nullptr, nullptr) == SQLITE_OK || Fail();
}

bool SqliteLinkStore::Fail() {
  error_ = sqlite3_errmsg(database_);
  return false;
}

bool SqliteLinkStore::Count(const char* sql, int64_t first, const std::string& second,
                            int64_t& count) {
  sqlite3_stmt* prepared = Prepare(sql);
  Statement statement(prepared);
  statement.Number(1, first);
  if (prepared != nullptr && sqlite3_bind_parameter_count(prepared) > 1) {
    statement.Text(2, second);
  }
  if (!statement.Row()) {
    return Fail();
  }
  count = statement.NumberAt(0);
  return true;
}

}  // namespace QELO::Platform
