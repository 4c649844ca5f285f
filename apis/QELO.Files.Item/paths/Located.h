#pragma once

#include <string>

#include "paths/Folder.h"
#include "paths/Shares.h"
#include "paths/VirtualPath.h"

namespace files {

/// An item by the folder that holds it, which is open.
struct Located {
  VirtualPath path;
  Folder parent;     ///< for a shared folder that itself
  std::string name;  ///< "" for a shared folder

  /// What is there now; a link is looked at, not followed.
  Reason Look(Item& item) const {
    return name.empty() ? parent.LookAtItself(item) : parent.Look(name, item);
  }
};

/// @param folder  set on success alone, as is `located` below
Reason openFolder(const Shares& shares, const VirtualPath& path, Folder& folder);

/// The item itself need not be there.
Reason locate(const Shares& shares, const VirtualPath& path, Located& located);

}  // namespace files
