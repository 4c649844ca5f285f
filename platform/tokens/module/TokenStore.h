#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

struct sqlite3;
struct sqlite3_stmt;

namespace QELO::Platform {

/// The database of access tokens. A token stands for a user and lets calls through whose API and
/// method fit its patterns: a name, or "*" for all. Only the SHA-256 of a token is kept.
class TokenStore {
 public:
  /// The id of an account's user; kNobody when there is none.
  using FindUid = uid_t (*)(const char* user);
  static constexpr uid_t kNobody = static_cast<uid_t>(-1);

  /// Whom a token stands for.
  struct Owner {
    std::string user;
    uid_t uid = kNobody;     ///< the user's when the token was made
    bool isService = false;  ///< also while nobody may log in to the account
  };

  struct Entry {
    int64_t id = 0;
    Owner owner;
    std::string api;
    std::string method;
    int64_t created = 0;  ///< seconds since the epoch
    int64_t expires = 0;  ///< likewise; 0: never
  };

  enum class Grant { kGranted, kUnknown, kExpired, kOtherCall, kFailed };

  TokenStore() = default;
  ~TokenStore();
  TokenStore(const TokenStore&) = delete;
  TokenStore& operator=(const TokenStore&) = delete;

  /// A database of the first version, which kept no ids of users, is given those of today.
  /// @param create  makes the database, mode 0600, when it is missing
  /// @return false on failure, see Error(); Missing() tells whether there is no database yet
  bool Open(const char* path, bool create, FindUid findUid);
  bool Missing() const { return missing_; }
  /// What went wrong last.
  const std::string& Error() const { return error_; }

  /// @param entry  owner, patterns and expiry of the new token; receives its id
  /// @param token  receives the token, of which nothing but a hash is kept
  bool Create(Entry& entry, std::string& token);
  /// @param owner  receives whom the token stands for when the result is kGranted
  Grant Check(const std::string& token, const std::string& api, const std::string& method,
              int64_t now, Owner& owner);
  /// The SHA-256, 32 bytes, of the token with this number. @return false when it is no good token
  bool FindHash(int64_t id, int64_t now, unsigned char* hash);
  bool List(std::vector<Entry>& entries);
  /// @param found  receives whether there was such a token
  bool Revoke(int64_t id, bool& found);

 private:
  bool ReadVersion(int& version);
  /// Brings the tables to today's form; creates them first when `create` says so.
  bool Upgrade(bool create, FindUid findUid);
  bool AddOwners(FindUid findUid);
  bool Prepare(const char* sql, sqlite3_stmt*& statement);
  bool Execute(const char* sql);
  bool Fail();

  sqlite3* database_ = nullptr;
  bool missing_ = false;
  std::string error_;
};

}  // namespace QELO::Platform
