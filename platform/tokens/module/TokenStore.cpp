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
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr int kBusyMs = 2000;
constexpr char kSchema[] =
    "PRAGMA journal_mode=WAL;"
    "CREATE TABLE IF NOT EXISTS tokens("
    "id INTEGER PRIMARY KEY AUTOINCREMENT, hash BLOB NOT NULL UNIQUE, user TEXT NOT NULL,"
    "api TEXT NOT NULL, method TEXT NOT NULL, created INTEGER NOT NULL, expires INTEGER NOT NULL)";

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

bool fits(const std::string& pattern, const std::string& name) {
  return pattern == "*" || pattern == name;
}

}  // namespace

TokenStore::~TokenStore() {
  sqlite3_close(database_);
}

bool TokenStore::Open(const char* path, bool create) {
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
  if (sqlite3_open_v2(path, &database_, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr) !=
      SQLITE_OK) {
    return Fail();
  }
  sqlite3_busy_timeout(database_, kBusyMs);
  int keep = 1;  // else every process that comes and goes makes and removes the companion files
  sqlite3_file_control(database_, "main", SQLITE_FCNTL_PERSIST_WAL, &keep);
  return !create || Execute(kSchema);
}

bool TokenStore::Create(Entry& entry, std::string& token) {
  sqlite3_stmt* prepared = nullptr;
  const std::string secret = makeSecret();
  if (secret.empty()) {
    error_ = strerror(errno);
    return false;
  }
  if (!Prepare("INSERT INTO tokens(hash, user, api, method, created, expires)"
               " VALUES(?1, ?2, ?3, ?4, ?5, ?6)",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  entry.created = time(nullptr);
  bindHash(statement, 1, secret);
  bindText(statement, 2, entry.user);
  bindText(statement, 3, entry.api);
  bindText(statement, 4, entry.method);
  sqlite3_bind_int64(prepared, 5, entry.created);
  sqlite3_bind_int64(prepared, 6, entry.expires);
  if (sqlite3_step(prepared) != SQLITE_DONE) {
    return Fail();
  }
  entry.id = sqlite3_last_insert_rowid(database_);
  token = secret;
  return true;
}

TokenStore::Grant TokenStore::Check(const std::string& token, const std::string& api,
                                    const std::string& method, int64_t now, std::string& user) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT user, api, method, expires FROM tokens WHERE hash = ?1", prepared)) {
    return Grant::kFailed;
  }
  const Statement statement(prepared);
  bindHash(statement, 1, token);
  const int step = sqlite3_step(prepared);
  if (step != SQLITE_ROW) {
    return step == SQLITE_DONE || Fail() ? Grant::kUnknown : Grant::kFailed;
  }
  const int64_t expires = sqlite3_column_int64(prepared, 3);
  if (expires != 0 && expires <= now) {
    return Grant::kExpired;
  }
  if (!fits(columnText(statement, 1), api) || !fits(columnText(statement, 2), method)) {
    return Grant::kOtherCall;
  }
  user = columnText(statement, 0);
  return Grant::kGranted;
}

bool TokenStore::List(std::vector<Entry>& entries) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT id, user, api, method, created, expires FROM tokens ORDER BY id",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  int step = sqlite3_step(prepared);
  for (; step == SQLITE_ROW; step = sqlite3_step(prepared)) {
    entries.push_back({sqlite3_column_int64(prepared, 0), columnText(statement, 1),
                       columnText(statement, 2), columnText(statement, 3),
                       sqlite3_column_int64(prepared, 4), sqlite3_column_int64(prepared, 5)});
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
