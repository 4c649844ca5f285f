#pragma once

#include <memory>

#include "platform/sharing/LinkStore.h"

namespace QELO::Platform {

/// The process's connection to the database for the look-ups of a request: its records and the
/// check of its link are asked for one after the other, and opening costs more than asking. It ends
/// when the link was checked, before the application is asked, and at each fork.
class LinkConnection {
 public:
  /// Opens the database when it is not open, or another one stands in its place.
  /// @return null when it cannot be opened, which is logged once
  static LinkStore* Get();
  static void Drop();

 private:
  LinkConnection();
  static LinkConnection& Instance();

  bool tried_ = false;
  std::unique_ptr<LinkStore> store_;
  LinkStoreFile file_;  ///< that was opened, or tried
};

}  // namespace QELO::Platform
