#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "webapi/platform/Sharing.h"

namespace QELO::Platform {

/// A link as it is kept. Only a hash of its id is.
struct StoredLink {
  sharing::record::Entry::Fields entry;
  std::string name;
  std::string password;  ///< as crypt(3) hashes it; "": none
  int64_t created = 0;   ///< seconds since the epoch
  int64_t expires = 0;   ///< likewise; 0: never
  int64_t maxUses = 0;   ///< 0: without limit
  int64_t uses = 0;
  int64_t maxBytes = 0;  ///< 0: without limit
};

/// A visitor's session as it is kept, of its id a hash.
struct StoredSession {
  int64_t id = 0;
  uid_t ownerUid = static_cast<uid_t>(-1);
  std::string address;  ///< that it was opened from
  int64_t ends = 0;     ///< seconds since the epoch
};

/// The database of sharing links, with nothing of its engine in it. Outputs are unchanged unless a
/// result is kDone.
class LinkStore {
 public:
  enum class Result { kDone, kAbsent, kTooMany, kUsedUp, kFailed };

  static constexpr int kMostLinks = 1000;         ///< of one owner
  static constexpr int kMostVisits = 4096;        ///< sessions of one link
  static constexpr int kMostVisitsOfOne = 32;     ///< of those, from one address; the oldest goes
  static constexpr int64_t kKeptSeconds = 86400;  ///< how long ended sessions are known

  virtual ~LinkStore() = default;

  virtual Result FindLink(const std::string& secret, StoredLink& link) = 0;
  virtual Result FindSession(const std::string& secret, StoredSession& session) = 0;
  /// @param opened  receives when the session was opened for the link
  virtual Result FindToken(int64_t session, int64_t link, int64_t& opened) = 0;
  /// Waits for nobody, and nobody is told when it fails: a later call will do it.
  virtual void Extend(int64_t session, int64_t ends) = 0;

  /// @param link  receives its id
  virtual Result Add(const std::string& secret, StoredLink& link) = 0;
  virtual Result List(uid_t owner, std::vector<StoredLink>& links) = 0;
  /// @param link       kAbsent when it is not this owner's
  virtual Result Get(uid_t owner, int64_t id, StoredLink& link) = 0;
  /// @param secret     the link's new one, "": it keeps its own
  /// @param endVisits  whether those who have opened it have to do so again
  virtual Result Replace(const StoredLink& link, const std::string& secret, bool endVisits) = 0;
  virtual Result Remove(uid_t owner, int64_t id) = 0;

  /// Counts a use and makes a session for a link, both or none. Forgets sessions of long ago.
  virtual Result AddVisit(const StoredLink& link, const std::string& secret,
                          const StoredSession& session, int64_t now) = 0;

  /// What went wrong last.
  virtual const std::string& Error() const = 0;
};

/// Opens the database by the platform's module, which is loaded by the first call.
/// @param create  makes it when it is missing
/// @return null on failure, which is logged
std::unique_ptr<LinkStore> openLinkStore(bool create);

/// Which file the database is, as long as it lives; equal to none of another one's.
struct LinkStoreFile {
  dev_t device = 0;
  ino_t inode = 0;
  bool operator==(const LinkStoreFile&) const = default;
};

/// @return LinkStoreFile() when there is no database
LinkStoreFile findLinkStore();
/// Whether there is a database.
bool hasLinkStore();

}  // namespace QELO::Platform
