#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <string>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Seconds until the idle time-out; negative when past it.
long secondsLeft(const timespec& lastUse, int timeout);

/// A login session, as read from its file.
struct Session {
  /// Of a record without an id, which stands for no account.
  static constexpr uid_t kNobody = static_cast<uid_t>(-1);

  std::string user;
  uid_t uid = kNobody;       ///< the user's at login; an account made anew has another
  std::string address;       ///< the client's at login, in the short form; "" when it was not known
  std::string token;         ///< anti-forgery token
  bool skipCheckIp = false;  ///< not bound to the address
  std::string application;   ///< "" in the sessions that this platform makes
  std::string webApi;        ///< likewise

  UniqueFd file;
  timespec lastUse{};

  /// Seconds until the idle time-out; negative when past it.
  long SecondsLeft(int timeout) const { return secondsLeft(lastUse, timeout); }
  /// Counts now as the last use. @return false when that cannot be written
  bool Refresh();
};

/// The login sessions: one file a session in a directory of root's, named by the session id. Its
/// modification time is the session's last use.
class SessionStore {
 public:
  enum class Result {
    kGood,
    kMalformed,  ///< the text cannot be a session id
    kAbsent,
    kBroken  ///< the file or the directory cannot be read, or holds no session
  };

  /// @param create  make the directory when it is missing
  explicit SessionStore(bool create = false);

  Result Read(const std::string& id, Session& session) const;
  /// When the session was last used; all else of it is not looked at.
  static Result ReadLastUse(const std::string& id, timespec& lastUse);
  /// Ends the user's session that was used longest ago when there would be more than `limit`.
  /// @param id, token  receive the new secrets
  bool Create(const Session& session, size_t limit, std::string& id, std::string& token) const;
  bool Remove(const std::string& id) const;
  /// Removes the files of sessions that timed out long ago.
  /// @param pause  nothing is done when this was called less than so many seconds ago
  void Purge(int timeout, int pause) const;

 private:
  UniqueFd dir_;
  int dirError_ = 0;
};

}  // namespace QELO::Platform
