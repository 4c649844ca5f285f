#include "work/Walks.h"

#include "paths/Entries.h"
#include "paths/VirtualPath.h"
#include "work/Stop.h"

namespace files {
namespace {

constexpr int kMostRounds = 16;  ///< through a folder that others fill while it is emptied

/// Enters the folder that an item is.
Reason enter(const Stand& stand, Folder& inner, Entries& entries) {
  if (stand.depth >= VirtualPath::kDeepestWalk) {
    return Reason::kTooDeep;
  }
  const Reason reason = stand.folder.Enter(stand.name, inner);
  return reason != Reason::kNone ? reason : entries.Open(inner);
}

bool fail(const Stand& stand, Reason reason, Report& report) {
  report.Failed(stand.path, reason);
  return false;
}

/// Empties a folder. Names may be passed over while others go, so it is read until a round removes
/// nothing more.
/// @return whether it is empty
bool empty(const Stand& stand, const Folder& inner, Entries& entries, Report& report) {
  bool isEmpty = true;
  bool removedSome = true;
  for (int round = 0; round < kMostRounds && removedSome && isEmpty; ++round) {
    removedSome = false;
    std::string name;
    while (!Stop::IsAsked() && entries.Next(name)) {
      if (removeItem(stand.Below(inner, name), report)) {
        removedSome = true;
      } else {
        isEmpty = false;
      }
    }
    if (Stop::IsAsked()) {
      return false;
    }
    if (entries.Fault() != Reason::kNone) {
      return fail(stand, entries.Fault(), report);
    }
    entries.Rewind();
  }
  return isEmpty;
}

bool removeFolder(const Stand& stand, Report& report) {
  // Most folders of a removal are not empty, but an empty one may be removed unread.
  Reason reason = stand.folder.RemoveFolder(stand.name);
  if (reason == Reason::kExists) {
    Folder inner;
    Entries entries;
    reason = enter(stand, inner, entries);
    if (reason == Reason::kNone) {
      if (!empty(stand, inner, entries, report)) {
        return false;
      }
      reason = stand.folder.RemoveFolder(stand.name);
    }
  }
  if (reason != Reason::kNone) {
    return fail(stand, reason, report);
  }
  report.DoneItem();
  return true;
}

}  // namespace

bool countItems(const Stand& stand, const std::function<bool(uint64_t)>& found) {
  Item item;
  if (stand.folder.Look(stand.name, item) != Reason::kNone) {
    return true;
  }
  if (!found(item.size) || Stop::IsAsked()) {
    return false;
  }
  Folder inner;
  Entries entries;
  if (!item.IsFolder() || enter(stand, inner, entries) != Reason::kNone) {
    return true;
  }
  std::string name;
  while (entries.Next(name)) {
    if (!countItems(stand.Below(inner, name), found)) {
      return false;
    }
  }
  return true;
}

bool removeItem(const Stand& stand, Report& report) {
  Item item;
  report.Doing(stand.path);
  Reason reason = stand.folder.Look(stand.name, item);
  if (reason == Reason::kNone) {
    if (item.type == ItemType::kMount) {
      reason = Reason::kMount;
    } else if (item.IsFolder()) {
      return removeFolder(stand, report);
    } else {
      reason = stand.folder.RemoveFile(stand.name);
    }
  }
  if (reason != Reason::kNone) {
    return fail(stand, reason, report);
  }
  report.DoneBytes(item.size);
  report.DoneItem();
  return true;
}

}  // namespace files
