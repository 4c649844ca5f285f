#include "paths/Located.h"

namespace files {

Reason openFolder(const Shares& shares, const VirtualPath& path, Folder& folder) {
  const Share* share = path.IsRoot() ? nullptr : shares.Find(path.Share());
  if (share == nullptr) {
    return Reason::kNoShare;
  }
  Folder root;
  const Reason reason = Folder::OpenShare(*share, root);
  return reason == Reason::kNone ? root.Enter(path.Below(), folder) : reason;
}

Reason locate(const Shares& shares, const VirtualPath& path, Located& located) {
  const Reason reason = openFolder(shares, path.IsShare() ? path : path.Parent(), located.parent);
  if (reason == Reason::kNone) {
    located.path = path;
    located.name = path.IsShare() ? "" : path.Name();
  }
  return reason;
}

}  // namespace files
