// The database's sessions of visitors: made when a link is opened, ended when it changes or goes.

#include "platform/base/module/SecretHash.h"
#include "platform/base/module/Statement.h"
#include "platform/sharing/module/SqliteLinkStore.h"
#include "platform/sharing/module/Transaction.h"

namespace QELO::Platform {

LinkStore::Result SqliteLinkStore::AddVisit(const StoredLink& link, const std::string& secret,
                                            const StoredSession& session, int64_t now) {
  Transaction transaction(*this);
  if (!transaction.Begun()) {
    return Failed();
  }
  Statement forget(Prepare("DELETE FROM sessions WHERE ends < ?1"));
  if (!forget.Number(1, now - kKeptSeconds).Run() ||
      !Execute("DELETE FROM tokens WHERE session NOT IN (SELECT id FROM sessions)")) {
    return Failed();
  }
  Result result = UseOnce(link);
  if (result == Result::kDone) {
    result = MakeRoom(link.entry.id, session.address);
  }
  if (result == Result::kDone) {
    result = InsertVisit(link.entry.id, secret, session, now);
  }
  return result != Result::kDone || transaction.Commit() ? result : Failed();
}

/// Of a link as it was when its password was checked.
LinkStore::Result SqliteLinkStore::UseOnce(const StoredLink& link) {
  Statement statement(
      Prepare("UPDATE links SET uses = uses + 1"
              " WHERE id = ?1 AND password = ?2 AND (max_uses = 0 OR uses < max_uses)"));
  if (!statement.Number(1, link.entry.id).Text(2, link.password).Run()) {
    return Failed();
  }
  return sqlite3_changes(database_) > 0 ? Result::kDone : Result::kUsedUp;
}

/// An address that opens a link over and over makes its own sessions go, and nobody else's.
LinkStore::Result SqliteLinkStore::MakeRoom(int64_t link, const std::string& address) {
  int64_t ofAll = 0;
  int64_t ofOne = 0;
  if (!Count("SELECT count(*) FROM tokens WHERE link = ?1", link, "", ofAll) ||
      !Count("SELECT count(*) FROM tokens t JOIN sessions s ON s.id = t.session"
             " WHERE t.link = ?1 AND s.address = ?2",
             link, address, ofOne)) {
    return Result::kFailed;
  }
  if (ofOne >= kMostVisitsOfOne) {
    Statement statement(
        Prepare("DELETE FROM sessions WHERE id = (SELECT min(s.id) FROM tokens t"
                " JOIN sessions s ON s.id = t.session WHERE t.link = ?1 AND s.address = ?2)"));
    return statement.Number(1, link).Text(2, address).Run() ? Result::kDone : Failed();
  }
  return ofAll < kMostVisits ? Result::kDone : Result::kTooMany;
}

LinkStore::Result SqliteLinkStore::InsertVisit(int64_t link, const std::string& secret,
                                               const StoredSession& session, int64_t now) {
  const std::string hash = secretHash(secret);
  Statement visit(Prepare("INSERT INTO sessions(hash, uid, address, ends) VALUES(?1, ?2, ?3, ?4)"));
  visit.Bytes(1, hash).Number(2, session.ownerUid).Text(3, session.address).Number(4, session.ends);
  if (!visit.Run()) {
    return Failed();
  }
  Statement token(Prepare("INSERT INTO tokens(session, link, opened) VALUES(?1, ?2, ?3)"));
  token.Number(1, sqlite3_last_insert_rowid(database_)).Number(2, link).Number(3, now);
  return token.Run() ? Result::kDone : Failed();
}

bool SqliteLinkStore::EndVisits(int64_t link) {
  Statement statement(Prepare("DELETE FROM tokens WHERE link = ?1"));
  return statement.Number(1, link).Run();
}

}  // namespace QELO::Platform
