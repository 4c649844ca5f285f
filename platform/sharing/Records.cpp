#include "platform/base/Secrets.h"
#include "platform/sharing/LinkConnection.h"
#include "webapi/platform/Sharing.h"

namespace QELO::sharing::db {

using Platform::LinkConnection;
using Platform::LinkStore;

SharingDB& SharingDB::Instance() {
  static SharingDB instance;
  return instance;
}

bool SharingDB::IsGood() const {
  return Platform::hasLinkStore();
}

EntryDB::EntryDB(SharingDB&) {}
SessionDB::SessionDB(SharingDB&) {}
TokenDB::TokenDB(SharingDB&) {}

bool EntryDB::GetByHash(const std::string& hash, record::Entry& entry) {
  LinkStore* store = Platform::isSecretText(hash) ? LinkConnection::Get() : nullptr;
  Platform::StoredLink link;
  if (store == nullptr || store->FindLink(hash, link) != LinkStore::Result::kDone) {
    return false;
  }
  entry = record::Entry(std::move(link.entry));
  return true;
}

bool SessionDB::GetBySessionId(const std::string& id, record::Session& session) {
  LinkStore* store = Platform::isSecretText(id) ? LinkConnection::Get() : nullptr;
  Platform::StoredSession found;
  if (store == nullptr || store->FindSession(id, found) != LinkStore::Result::kDone) {
    return false;
  }
  session = record::Session(found.id, found.ownerUid, found.ends);
  return true;
}

bool TokenDB::GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                                record::Token& token) {
  LinkStore* store = session.get_id() != 0 && entry.get_id() != 0 ? LinkConnection::Get() : nullptr;
  int64_t opened = 0;
  if (store == nullptr ||
      store->FindToken(session.get_id(), entry.get_id(), opened) != LinkStore::Result::kDone) {
    return false;
  }
  token = record::Token(opened);
  return true;
}

}  // namespace QELO::sharing::db
