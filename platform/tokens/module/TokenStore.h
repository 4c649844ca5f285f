#pragma once

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
  struct Entry {
    int64_t id = 0;
    std::string user;
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

  /// @param create  makes the database, mode 0600, when it is missing
  /// @return false on failure, see Error(); Missing() tells whether there is no database yet
  bool Open(const char* path, bool create);
  bool Missing() const { return missing_; }
  /// What went wrong last.
  const std::string& Error() const { return error_; }

  /// @param entry  user, patterns and expiry of the new token; receives its id
  /// @param token  receives the token, of which nothing but a hash is kept
  bool Create(Entry& entry, std::string& token);
  /// @param user  receives the user when the result is kGranted
  Grant Check(const std::string& token, const std::string& api, const std::string& method,
              int64_t now, std::string& user);
  bool List(std::vector<Entry>& entries);
  /// @param found  receives whether there was such a token
  bool Revoke(int64_t id, bool& found);

 private:
  bool Prepare(const char* sql, sqlite3_stmt*& statement);
  bool Execute(const char* sql);
  bool Fail();

  sqlite3* database_ = nullptr;
  bool missing_ = false;
  std::string error_;
};

}  // namespace QELO::Platform
