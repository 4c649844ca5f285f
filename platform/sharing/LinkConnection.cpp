#include "platform/sharing/LinkConnection.h"

#include <pthread.h>

namespace QELO::Platform {

LinkConnection::LinkConnection() {
  // SQLite's locks do not come along, and it would not know.
  pthread_atfork(Drop, nullptr, nullptr);
}

LinkConnection& LinkConnection::Instance() {
  // Never destroyed: a process may fork until its end.
  static LinkConnection& connection = *new LinkConnection;
  return connection;
}

LinkStore* LinkConnection::Get() {
  LinkConnection& connection = Instance();
  const LinkStoreFile file = findLinkStore();
  if (!connection.tried_ || !(file == connection.file_)) {
    connection.store_.reset();
    connection.tried_ = true;
    connection.file_ = file;
    connection.store_ = openLinkStore(false);
  }
  return connection.store_.get();
}

void LinkConnection::Drop() {
  LinkConnection& connection = Instance();
  connection.store_.reset();
  connection.tried_ = false;
}

}  // namespace QELO::Platform
