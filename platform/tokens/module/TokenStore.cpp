#include "platform/tokens/module/TokenStore.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "platform/base/Secrets.h"
#include "platform/base/module/OwnDatabase.h"
#include "platform/base/module/SecretHash.h"
#include "platform/tokens/module/TokenSchema.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr int kHashSize = 32;  ///< bytes of a secretHash()

struct Finalize {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, Finalize>;

void bindText(const Statement& statement, int index, const std::string& text) {
  sqlite3_bind_text(statement.get(), index, text.data(), static_cast<int>(text.size()),
                    SQLITE_TRANSIENT);
}

void bindHash(const Statement& statement, int index, const std::string& token) {
  const std::string hash = secretHash(token);
  sqlite3_bind_blob(statement.get(), index, hash.data(), static_cast<int>(hash.size()),
                    SQLITE_TRANSIENT);
}

/// Null stands for whoever it is.
void bindOwner(const Statement& statement, int first, const TokenStore::Owner* owner) {
  if (owner != nullptr) {
    bindText(statement, first, owner->user);
    sqlite3_bind_int64(statement.get(), first + 1, owner->uid);
  }
}

std::string columnText(const Statement& statement, int column) {
  const unsigned char* text = sqlite3_column_text(statement.get(), column);
  return text != nullptr ? reinterpret_cast<const char*>(text) : "";
}

/// The columns that each look-up names, in this order, and the entry that they make.
#define TOKEN_COLUMNS \
  "t.id, user, uid, service, name, readonly, address, created, expires, used, api, method"

TokenStore::Entry columnEntry(const Statement& statement) {
  sqlite3_stmt* row = statement.get();
  TokenStore::Entry entry;
  entry.id = sqlite3_column_int64(row, 0);
  entry.owner = {columnText(statement, 1), static_cast<uid_t>(sqlite3_column_int64(row, 2)),
                 sqlite3_column_int(row, 3) != 0};
  entry.name = columnText(statement, 4);
  entry.readOnly = sqlite3_column_int(row, 5) != 0;
  entry.address = columnText(statement, 6);
  entry.created = sqlite3_column_int64(row, 7);
  entry.expires = sqlite3_column_int64(row, 8);
  entry.used = sqlite3_column_int64(row, 9);
  return entry;
}

TokenStore::Scope columnScope(const Statement& statement) {
  return {columnText(statement, 10), columnText(statement, 11)};
}

bool fits(const std::string& pattern, const std::string& name) {
  return !pattern.empty() && pattern.back() == '*'
             ? name.compare(0, pattern.size() - 1, pattern, 0, pattern.size() - 1) == 0
             : pattern == name;
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
  return openOwnDatabase(path, database_, error_) &&
         TokenSchema(database_).Bring(create, findUid, error_);
}

bool TokenStore::Create(Entry& entry, std::string& token) {
  sqlite3_stmt* prepared = nullptr;
  const std::string secret = makeSecret();
  if (secret.empty()) {
    error_ = strerror(errno);
    return false;
  }
  if (!Execute("BEGIN IMMEDIATE") ||
      !Prepare("INSERT INTO tokens(hash, user, uid, service, name, readonly, address, created,"
               " expires) VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9)",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  entry.created = time(nullptr);
  bindHash(statement, 1, secret);
  bindText(statement, 2, entry.owner.user);
  sqlite3_bind_int64(prepared, 3, entry.owner.uid);
  sqlite3_bind_int(prepared, 4, entry.owner.isService ? 1 : 0);
  bindText(statement, 5, entry.name);
  sqlite3_bind_int(prepared, 6, entry.readOnly ? 1 : 0);
  bindText(statement, 7, entry.address);
  sqlite3_bind_int64(prepared, 8, entry.created);
  sqlite3_bind_int64(prepared, 9, entry.expires);
  if (sqlite3_step(prepared) != SQLITE_DONE) {
    return Fail();
  }
  entry.id = sqlite3_last_insert_rowid(database_);
  token = secret;
  return AddScopes(entry) && Commit();
}

bool TokenStore::AddScopes(const Entry& entry) {
  for (const Scope& scope : entry.scopes) {
    sqlite3_stmt* prepared = nullptr;
    if (!Prepare("INSERT OR IGNORE INTO scopes(token, api, method) VALUES(?1, ?2, ?3)", prepared)) {
      return false;
    }
    const Statement statement(prepared);
    sqlite3_bind_int64(prepared, 1, entry.id);
    bindText(statement, 2, scope.api);
    bindText(statement, 3, scope.method);
    if (sqlite3_step(prepared) != SQLITE_DONE) {
      return Fail();
    }
  }
  return true;
}

TokenStore::Grant TokenStore::Check(const std::string& token, const std::string& api,
                                    const std::string& method, int64_t now, const Accept& accept,
                                    Entry& entry) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT " TOKEN_COLUMNS
               " FROM tokens t LEFT JOIN scopes ON token = t.id WHERE hash = ?1",
               prepared)) {
    return Grant::kFailed;
  }
  Statement statement(prepared);
  bindHash(statement, 1, token);
  int step = sqlite3_step(prepared);
  if (step != SQLITE_ROW) {
    return step == SQLITE_DONE || Fail() ? Grant::kUnknown : Grant::kFailed;
  }
  const Entry found = columnEntry(statement);
  if (found.expires != 0 && found.expires <= now) {
    return Grant::kExpired;
  }
  bool isFor = false;
  for (; step == SQLITE_ROW && !isFor; step = sqlite3_step(prepared)) {
    const Scope scope = columnScope(statement);
    isFor = fits(scope.api, api) && fits(scope.method, method);
  }
  statement.reset();
  const Grant grant = isFor ? accept(found) : Grant::kOtherCall;
  if (grant == Grant::kGranted) {
    entry = found;
    if (now - found.used >= kUsePause) {
      NoteUse(found.id, now);
    }
  }
  return grant;
}

/// Left out when somebody else writes: a call does not wait for it.
void TokenStore::NoteUse(int64_t id, int64_t now) {
  sqlite3_stmt* prepared = nullptr;
  sqlite3_busy_timeout(database_, 0);
  if (Prepare("UPDATE tokens SET used = ?2 WHERE id = ?1", prepared)) {
    const Statement statement(prepared);
    sqlite3_bind_int64(prepared, 1, id);
    sqlite3_bind_int64(prepared, 2, now);
    if (sqlite3_step(prepared) == SQLITE_DONE) {
      emptyDatabaseLogAtClose(database_);
    }
  }
  sqlite3_busy_timeout(database_, kDatabasePatienceMs);
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
  if (sqlite3_step(prepared) != SQLITE_ROW || sqlite3_column_bytes(prepared, 0) != kHashSize) {
    return false;
  }
  memcpy(hash, sqlite3_column_blob(prepared, 0), kHashSize);
  return true;
}

bool TokenStore::List(const Owner* owner, std::vector<Entry>& entries) {
  sqlite3_stmt* prepared = nullptr;
  if (!Prepare("SELECT " TOKEN_COLUMNS " FROM tokens t LEFT JOIN scopes ON token = t.id"
               " WHERE ?1 IS NULL OR (user = ?1 AND uid = ?2) ORDER BY t.id, api, method",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  bindOwner(statement, 1, owner);
  int step = sqlite3_step(prepared);
  for (; step == SQLITE_ROW; step = sqlite3_step(prepared)) {
    if (entries.empty() || entries.back().id != sqlite3_column_int64(prepared, 0)) {
      entries.push_back(columnEntry(statement));
    }
    entries.back().scopes.push_back(columnScope(statement));
  }
  return step == SQLITE_DONE || Fail();
}

bool TokenStore::Revoke(int64_t id, const Owner* owner, bool& found) {
  sqlite3_stmt* prepared = nullptr;
  if (!Execute("BEGIN IMMEDIATE") ||
      !Prepare("DELETE FROM tokens WHERE id = ?3 AND (?1 IS NULL OR (user = ?1 AND uid = ?2))",
               prepared)) {
    return false;
  }
  const Statement statement(prepared);
  bindOwner(statement, 1, owner);
  sqlite3_bind_int64(prepared, 3, id);
  if (sqlite3_step(prepared) != SQLITE_DONE) {
    return Fail();
  }
  found = sqlite3_changes(database_) > 0;
  return Execute("DELETE FROM scopes WHERE token NOT IN (SELECT id FROM tokens)") && Commit();
}

bool TokenStore::Prepare(const char* sql, sqlite3_stmt*& statement) {
  return sqlite3_prepare_v2(database_, sql, -1, &statement, nullptr) == SQLITE_OK || Fail();
}

bool TokenStore::Execute(const char* sql) {
  return sqlite3_exec(database_, sql, nullptr, nullptr, nullptr) == SQLITE_OK || Fail();
}

bool TokenStore::Commit() {
  if (!Execute("COMMIT")) {
    return false;
  }
  emptyDatabaseLogAtClose(database_);
  return true;
}

bool TokenStore::Fail() {
  error_ = sqlite3_errmsg(database_);
  return false;
}

}  // namespace QELO::Platform
