#pragma once

#include <memory>

#include "platform/sharing/LinkStore.h"

namespace QELO::sharing::db {

/// The database for the look-ups of one request; opened by the first that needs it.
struct Connection {
  /// @return null when it cannot be opened, which is logged once
  Platform::LinkStore* Get() {
    if (!tried) {
      tried = true;
      store = Platform::openLinkStore(false);
    }
    return store.get();
  }

  bool tried = false;
  std::unique_ptr<Platform::LinkStore> store;
};

}  // namespace QELO::sharing::db
