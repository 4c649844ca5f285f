#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/sharing/LinkStore.h"

struct sqlite3;
struct sqlite3_stmt;

namespace QELO::Platform {

/// The database in SQLite, for one process that does not fork while it is open.
class SqliteLinkStore : public LinkStore {
 public:
  SqliteLinkStore() = default;
  ~SqliteLinkStore() override;
  SqliteLinkStore(const SqliteLinkStore&) = delete;
  SqliteLinkStore& operator=(const SqliteLinkStore&) = delete;

  /// @param create  makes the database, mode 0600, when it is missing
  bool Open(const char* path, bool create);

  Result FindLink(const std::string& secret, StoredLink& link) override;
  Result FindSession(const std::string& secret, StoredSession& session) override;
  Result FindToken(int64_t session, int64_t link, int64_t& opened) override;
  void Extend(int64_t session, int64_t ends) override;
  Result Add(const std::string& secret, StoredLink& link) override;
  Result List(uid_t owner, std::vector<StoredLink>& links) override;
  Result Get(uid_t owner, int64_t id, StoredLink& link) override;
  Result Replace(const StoredLink& link, const std::string& secret, bool endVisits) override;
  Result Remove(uid_t owner, int64_t id) override;
  Result AddVisit(const StoredLink& link, const std::string& secret, const StoredSession& session,
                  int64_t now) override;
  const std::string& Error() const override { return error_; }

 private:
  class Transaction;

  bool MakeFile(const char* path);
  bool Upgrade();
  bool ReadVersion(int64_t& version);
  sqlite3_stmt* Prepare(const char* sql);
  /// Runs statements that need nothing. @return false on failure
  bool Execute(const char* sql);
  bool Fail();
  Result Failed() { return Fail(), Result::kFailed; }

  /// The number that a statement's one row holds, given two numbers. @return false on failure
  bool Count(const char* sql, int64_t first, const std::string& second, int64_t& count);
  bool EndVisits(int64_t link);
  Result UseOnce(const StoredLink& link);
  Result MakeRoom(int64_t link, const std::string& address);
  Result InsertVisit(int64_t link, const std::string& secret, const StoredSession& session,
                     int64_t now);

  sqlite3* database_ = nullptr;
  std::map<const char*, sqlite3_stmt*> statements_;  ///< by their text's place
  std::string error_;
};

}  // namespace QELO::Platform
