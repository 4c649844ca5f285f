#include "platform/sharing/module/SqliteLinkStore.h"

#include "platform/base/module/SecretHash.h"
#include "platform/base/module/Statement.h"
#include "platform/sharing/module/Transaction.h"

namespace QELO::Platform {
namespace {

constexpr char kColumns[] =
    "SELECT id, owner, uid, project, name, path, protect, match_address, upload, password,"
    " created, expires, max_uses, uses, max_bytes FROM links WHERE ";

std::string selectLinks(const char* condition) {
  return std::string(kColumns) + condition;
}

void readLink(Statement& row, StoredLink& link) {
  StoredLink read;
  read.entry.id = row.NumberAt(0);
  read.entry.ownerName = row.TextAt(1);
  read.entry.ownerUid = static_cast<uid_t>(row.NumberAt(2));
  read.entry.projectName = row.TextAt(3);
  read.name = row.TextAt(4);
  read.entry.path = row.TextAt(5);
  read.entry.protectType = static_cast<int>(row.NumberAt(6));
  read.entry.enableMatchIp = row.NumberAt(7) != 0;
  read.entry.allowUpload = row.NumberAt(8) != 0;
  read.password = row.TextAt(9);
  read.created = row.NumberAt(10);
  read.expires = row.NumberAt(11);
  read.maxUses = row.NumberAt(12);
  read.uses = row.NumberAt(13);
  read.maxBytes = row.NumberAt(14);
  link = std::move(read);
}

/// What a link's owner says of it, as the parameters from 2 on.
void bindTerms(Statement& statement, const StoredLink& link) {
  statement.Text(2, link.name)
      .Text(3, link.entry.path)
      .Number(4, link.entry.protectType)
      .Number(5, link.entry.enableMatchIp ? 1 : 0)
      .Number(6, link.entry.allowUpload ? 1 : 0)
      .Text(7, link.password)
      .Number(8, link.expires)
      .Number(9, link.maxUses)
      .Number(10, link.maxBytes);
}

}  // namespace

LinkStore::Result SqliteLinkStore::FindLink(const std::string& secret, StoredLink& link) {
  static const std::string select = selectLinks("hash = ?1");
  const std::string hash = secretHash(secret);
  Statement statement(Prepare(select.c_str()));
  statement.Bytes(1, hash);
  if (!statement.Row()) {
    return statement.Good() ? Result::kAbsent : Failed();
  }
  readLink(statement, link);
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::FindSession(const std::string& secret, StoredSession& session) {
  const std::string hash = secretHash(secret);
  Statement statement(Prepare("SELECT id, uid, address, ends FROM sessions WHERE hash = ?1"));
  statement.Bytes(1, hash);
  if (!statement.Row()) {
    return statement.Good() ? Result::kAbsent : Failed();
  }
  session = {statement.NumberAt(0), static_cast<uid_t>(statement.NumberAt(1)), statement.TextAt(2),
             statement.NumberAt(3)};
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::FindToken(int64_t session, int64_t link, int64_t& opened) {
  Statement statement(Prepare("SELECT opened FROM tokens WHERE session = ?1 AND link = ?2"));
  statement.Number(1, session).Number(2, link);
  if (!statement.Row()) {
    return statement.Good() ? Result::kAbsent : Failed();
  }
  opened = statement.NumberAt(0);
  return Result::kDone;
}

void SqliteLinkStore::Extend(int64_t session, int64_t ends) {
  sqlite3_busy_timeout(database_, 0);
  Transaction transaction(*this);
  Statement statement(Prepare("UPDATE sessions SET ends = ?2 WHERE id = ?1"));
  statement.Number(1, session).Number(2, ends);
  if (transaction.Begun() && statement.Run()) {
    transaction.Commit();
  }
}

LinkStore::Result SqliteLinkStore::List(uid_t owner, std::vector<StoredLink>& links) {
  static const std::string select = selectLinks("uid = ?1 ORDER BY id");
  Statement statement(Prepare(select.c_str()));
  statement.Number(1, owner);
  std::vector<StoredLink> found;
  while (statement.Row()) {
    readLink(statement, found.emplace_back());
  }
  if (!statement.Good()) {
    return Failed();
  }
  links = std::move(found);
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::Get(uid_t owner, int64_t id, StoredLink& link) {
  static const std::string select = selectLinks("uid = ?1 AND id = ?2");
  Statement statement(Prepare(select.c_str()));
  statement.Number(1, owner).Number(2, id);
  if (!statement.Row()) {
    return statement.Good() ? Result::kAbsent : Failed();
  }
  readLink(statement, link);
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::Add(const std::string& secret, StoredLink& link) {
  Transaction transaction(*this);
  int64_t count = 0;
  if (!transaction.Begun() ||
      !Count("SELECT count(*) FROM links WHERE uid = ?1", link.entry.ownerUid, "", count)) {
    return Failed();
  }
  if (count >= kMostLinks) {
    return Result::kTooMany;
  }
  const std::string hash = secretHash(secret);
  Statement statement(
      Prepare("INSERT INTO links(hash, name, path, protect, match_address, upload, password,"
              " expires, max_uses, max_bytes, owner, uid, project, created, uses)"
              " VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11, ?12, ?13, ?14, 0)"));
  bindTerms(statement.Bytes(1, hash), link);
  statement.Text(11, link.entry.ownerName)
      .Number(12, link.entry.ownerUid)
      .Text(13, link.entry.projectName)
      .Number(14, link.created);
  if (!statement.Run()) {
    return Failed();
  }
  const int64_t id = sqlite3_last_insert_rowid(database_);
  if (!transaction.Commit()) {
    return Failed();
  }
  link.entry.id = id;
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::Replace(const StoredLink& link, const std::string& secret,
                                           bool endVisits) {
  Transaction transaction(*this);
  if (!transaction.Begun()) {
    return Failed();
  }
  Statement statement(
      Prepare("UPDATE links SET name = ?2, path = ?3, protect = ?4, match_address = ?5,"
              " upload = ?6, password = ?7, expires = ?8, max_uses = ?9, max_bytes = ?10"
              " WHERE id = ?1 AND uid = ?11"));
  bindTerms(statement.Number(1, link.entry.id), link);
  if (!statement.Number(11, link.entry.ownerUid).Run()) {
    return Failed();
  }
  if (sqlite3_changes(database_) == 0) {
    return Result::kAbsent;
  }
  const std::string hash = secretHash(secret);
  Statement renewal(Prepare("UPDATE links SET hash = ?2 WHERE id = ?1"));
  renewal.Number(1, link.entry.id).Bytes(2, hash);
  if ((!secret.empty() && !renewal.Run()) || (endVisits && !EndVisits(link.entry.id)) ||
      !transaction.Commit()) {
    return Failed();
  }
  return Result::kDone;
}

LinkStore::Result SqliteLinkStore::Remove(uid_t owner, int64_t id) {
  Transaction transaction(*this);
  if (!transaction.Begun()) {
    return Failed();
  }
  Statement statement(Prepare("DELETE FROM links WHERE id = ?1 AND uid = ?2"));
  if (!statement.Number(1, id).Number(2, owner).Run()) {
    return Failed();
  }
  if (sqlite3_changes(database_) == 0) {
    return Result::kAbsent;
  }
  return EndVisits(id) && transaction.Commit() ? Result::kDone : Failed();
}

}  // namespace QELO::Platform
