#include "platform/tokens/module/TokenStore.h"

#include <fcntl.h>
#include <openssl/sha.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "platform/base/Secrets.h"
#include "webapi/base/OwnFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr int kBusyMs = 2000;
constexpr int kVersion = 1;
constexpr char kFirstTables[] =
    "CREATE TABLE IF NOT EXISTS tokens("
    "id INTEGER PRIMARY KEY AUTOINCREMENT, hash BLOB NOT NULL UNIQUE, user TEXT NOT NULL,"
    "api TEXT NOT NULL, method TEXT NOT NULL, created INTEGER NOT NULL, expires INTEGER NOT NULL)";
constexpr char kOwnerColumns[] =
    "ALTER TABLE tokens ADD COLUMN uid INTEGER NOT NULL DEFAULT 4294967295;"
    "ALTER TABLE tokens ADD COLUMN service INTEGER NOT NULL DEFAULT 0";

struct Finalize {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, Finalize>;

void bindText(const Statement& statement, int index, const std::string& text) {
  sqlite3_bind_text(statement.get(), index, text.data(), static_cast<int>(text.size()),
                    SQLITE_TRANSIENT);
}

void bindHash(const Statement& statement, int index, const std::string& token) {
  unsigned char hash[SHA256_DIGEST_LENGTH];
  SHA256(reinterpret_cast<const unsigned char*>(token.data()), token.size(), hash);
  sqlite3_bind_blob(statement.get(), index, hash, sizeof hash, SQLITE_TRANSIENT);
}

std::string columnText(const Statement& statement, int column) {
  const unsigned char* text = sqlite3_column_text(statement.get(), column);
  return text != nullptr ? reinterpret_cast<const char*>(text) : "";
}

TokenStore::Owner columnOwner(const Statement& statement, int first) {
  return {columnText(statement, first),
          static_cast<uid_t>(sqlite3_column_int64(statement.get(), first + 1)),
          sqlite3_column_int(statement.get(), first + 2) != 0};
}

bool fits(const std::string& pattern, const std::string& name) {
  return pattern == "*" || pattern == name;
}

}  // namespace

TokenStore::~TokenStore() {
  sqlite3_close(database_);
}

bool TokenStore::Open(const char* path, bool create, FindUid findUid) {
  struct stat info {};
  missing_ = stat(path, &info) != 0 && errno == ENOENT;
  if (missing_ && create) {
    // Ours alone from its first moment; SQLite gives its companion files the same mode.
    const UniqueFd file(open(path, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
    missing_ = !file;
  }
  if (missing_) {
    error_ = strerror(errno);
    return false;
  }
  if (OthersMayChange(path)) {
    error_ = "others may write it or its directory";
    return false;
  }
  if (sqlite3_open_v2(path, &database_, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr) !=
      SQLITE_OK) {
    return Fail();
  }
  sqlite3_busy_timeout(database_, kBusyMs);
  int keep = 1;  // else every process that comes and goes makes and removes the companion files
  sqlite3_file_control(database_, "main", SQLITE_FCNTL_PERSIST_WAL, &keep);
  int version = 0;
  if (!ReadVersion(version)) {
    return false;
  }
  if (version > kVersion) {
    error_ = "made by a later version of this program";
    return false;
  }
  return version == kVersion || Upgrade(create, findUid);
}

bool TokenStore::ReadVersion(int& version) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("PRAGMA user_version", prepared)) {
    return false;
  }
  const Statement statement(prepared);
  if (sqlite3_step(prepared) != SQLITE_ROW) {
    return Fail();
  }
  version = sqlite3_column_int(prepared, 0);
  return true;
}

bool TokenStore::Upgrade(bool create, FindUid findUid) {
  int version = 0;
  if ((create && !Execute("PRAGMA journal_mode=WAL")) || !Execute("BEGIN IMMEDIATE")) {
    return false;
  }
  // Another process may have done it while this one waited.
  const bool done =
      ReadVersion(version) &&
      (version == kVersion || ((!create || Execute(kFirstTables)) && Execute(kOwnerColumns) &&
                               AddOwners(findUid) && Execute("PRAGMA user_version=1")));
  if (done && Execute("COMMIT")) {
    return true;
  }
  const std::string reason = error_;
  Execute("ROLLBACK");
  error_ = reason;
  return false;
}

bool TokenStore::AddOwners(FindUid findUid) {
  sqlite3_stmt* users = nullptr;
  sqlite3_stmt* update = nullptr;
  if (!Prepare("SELECT DISTINCT user FROM tokens", users)) {
    return false;
  }
  const Statement reading(users);
  if (!Prepare("UPDATE tokens SET uid = ?1 WHERE user = ?2", update)) {
    return false;
  }
  const Statement writing(update);
  int step = sqlite3_step(users);
  for (; step == SQLITE_ROW; step = sqlite3_step(users)) {
    const std::string user = columnText(reading, 0);
    sqlite3_bind_int64(update, 1, findUid(user.c_str()));
    bindText(writing, 2, user);
    if (sqlite3_step(update) != SQLITE_DONE) {
      return Fail();
    }
    sqlite3_reset(update);
  }
  return step == SQLITE_DONE || Fail();
}

bool TokenStore::Create(Entry& entry, std::string& token) {
  sqlite3_stmt* prepared = nullptr;
  const std::string secret = makeSecret();
  if (secret.empty()) {
    error_ = strerror(errno);
    return false;
  }
  if (!Prepare("INSERT INTO tokens(hash, user, api, method, created, expires, uid, service)"
               " VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  entry.created = time(nullptr);
  bindHash(statement, 1, secret);
  bindText(statement, 2, entry.owner.user);
  bindText(statement, 3, entry.api);
  bindText(statement, 4, entry.method);
  sqlite3_bind_int64(prepared, 5, entry.created);
  sqlite3_bind_int64(prepared, 6, entry.expires);
  sqlite3_bind_int64(prepared, 7, entry.owner.uid);
  sqlite3_bind_int(prepared, 8, entry.owner.isService ? 1 : 0);
  if (sqlite3_step(prepared) != SQLITE_DONE) {
    return Fail();
  }
  entry.id = sqlite3_last_insert_rowid(database_);
  token = secret;
  return true;
}

TokenStore::Grant TokenStore::Check(const std::string& token, const std::string& api,
                                    const std::string& method, int64_t now, Owner& owner) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT api, method, expires, user, uid, service FROM tokens WHERE hash = ?1",
               prepared)) {
    return Grant::kFailed;
  }
  const Statement statement(prepared);
  bindHash(statement, 1, token);
  const int step = sqlite3_step(prepared);
  if (step != SQLITE_ROW) {
    return step == SQLITE_DONE || Fail() ? Grant::kUnknown : Grant::kFailed;
  }
  const int64_t expires = sqlite3_column_int64(prepared, 2);
  if (expires != 0 && expires <= now) {
    return Grant::kExpired;
  }
  if (!fits(columnText(statement, 0), api) || !fits(columnText(statement, 1), method)) {
    return Grant::kOtherCall;
  }
  owner = columnOwner(statement, 3);
  return Grant::kGranted;
}

bool TokenStore::FindHash(int64_t id, int64_t now, unsigned char* hash) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT hash FROM tokens WHERE id = ?1 AND (expires = 0 OR expires > ?2)",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  sqlite3_bind_int64(prepared, 1, id);
  sqlite3_bind_int64(prepared, 2, now);
  if (sqlite3_step(prepared) != SQLITE_ROW ||
      sqlite3_column_bytes(prepared, 0) != SHA256_DIGEST_LENGTH) {
    return false;
  }
  memcpy(hash, sqlite3_column_blob(prepared, 0), SHA256_DIGEST_LENGTH);
  return true;
}

bool TokenStore::List(std::vector<Entry>& entries) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare(
          "SELECT id, api, method, created, expires, user, uid, service FROM tokens ORDER BY id",
          prepared)) {
    return false;
  }
  const Statement statement(prepared);
  int step = sqlite3_step(prepared);
  for (; step == SQLITE_ROW; step = sqlite3_step(prepared)) {
    entries.push_back({sqlite3_column_int64(prepared, 0), columnOwner(statement, 5),
                       columnText(statement, 1), columnText(statement, 2),
                       sqlite3_column_int64(prepared, 3), sqlite3_column_int64(prepared, 4)});
  }
  return step == SQLITE_DONE || Fail();
}

bool TokenStore::Revoke(int64_t id, bool& found) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("DELETE FROM tokens WHERE id = ?1", prepared)) {
    return false;
  }
  const Statement statement(prepared);
  sqlite3_bind_int64(prepared, 1, id);
  if (sqlite3_step(prepared) != SQLITE_DONE) {
    return Fail();
  }
  found = sqlite3_changes(database_) > 0;
  return true;
}

bool TokenStore::Prepare(const char* sql, sqlite3_stmt*& statement) {
  return sqlite3_prepare_v2(database_, sql, -1, &statement, nullptr) == SQLITE_OK || Fail();
}

bool TokenStore::Execute(const char* sql) {
  return sqlite3_exec(database_, sql, nullptr, nullptr, nullptr) == SQLITE_OK || Fail();
}

bool TokenStore::Fail() {
  error_ = sqlite3_errmsg(database_);
  return false;
}

}  // namespace QELO::Platform
