#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

struct sqlite3;
struct sqlite3_stmt;

namespace QELO::Platform {

/// The database of access tokens. A token stands for a user and lets calls through whose API and
/// method fit one of its scopes. Only the SHA-256 of a token is kept.
class TokenStore {
 public:
  /// The id of an account's user; kNobody when there is none.
  using FindUid = uid_t (*)(const char* user);
  static constexpr uid_t kNobody = static_cast<uid_t>(-1);
  /// Seconds for which a token's last use is not written again.
  static constexpr int64_t kUsePause = 60;

  /// Whom a token stands for.
  struct Owner {
    std::string user;
    uid_t uid = kNobody;     ///< the user's when the token was made
    bool isService = false;  ///< also while nobody may log in to the account
  };

  /// Calls that a token is for: names, the beginning of names with a "*", or "*" for all.
  struct Scope {
    std::string api;
    std::string method;
  };

  struct Entry {
    int64_t id = 0;
    Owner owner;
    std::string name;  ///< its user's word for what it is for
    std::vector<Scope> scopes;
    bool readOnly = false;  ///< for methods alone whose description says that they change nothing
    std::string address;    ///< address or network that it may be used from; "": any
    int64_t created = 0;    ///< seconds since the epoch
    int64_t expires = 0;    ///< likewise; 0: never
    int64_t used = 0;       ///< likewise, by kUsePause; 0: not yet
  };

  enum class Grant { kGranted, kUnknown, kExpired, kOtherCall, kFailed };
  /// Asked of a token that fits a call: whether it may be used.
  using Accept = std::function<Grant(const Entry&)>;

  TokenStore() = default;
  ~TokenStore();
  TokenStore(const TokenStore&) = delete;
  TokenStore& operator=(const TokenStore&) = delete;

  /// A database of a former version is brought to today's form; users of the first, which kept no
  /// ids of them, are given those of today.
  /// @param create  makes the database, mode 0600, when it is missing
  /// @return false on failure, see Error(); Missing() tells whether there is no database yet
  bool Open(const char* path, bool create, FindUid findUid);
  bool Missing() const { return missing_; }
  /// What went wrong last.
  const std::string& Error() const { return error_; }

  /// @param entry  owner, scopes and limits of the new token; receives its id
  /// @param token  receives the token, of which nothing but a hash is kept
  bool Create(Entry& entry, std::string& token);
  /// Notes the use when it is granted.
  /// @param entry  receives the token's, but its scopes, when the result is kGranted
  Grant Check(const std::string& token, const std::string& api, const std::string& method,
              int64_t now, const Accept& accept, Entry& entry);
  /// The SHA-256, 32 bytes, of the token with this number. @return false when it is no good token
  bool FindHash(int64_t id, int64_t now, unsigned char* hash);
  /// @param owner  whose; null: everybody's
  bool List(const Owner* owner, std::vector<Entry>& entries);
  /// @param owner  who must own it; null: whoever does
  /// @param found  receives whether there was such a token
  bool Revoke(int64_t id, const Owner* owner, bool& found);

 private:
  bool AddScopes(const Entry& entry);
  void NoteUse(int64_t id, int64_t now);
  bool Prepare(const char* sql, sqlite3_stmt*& statement);
  bool Execute(const char* sql);
  bool Commit();
  bool Fail();

  sqlite3* database_ = nullptr;
  bool missing_ = false;
  std::string error_;
};

}  // namespace QELO::Platform
