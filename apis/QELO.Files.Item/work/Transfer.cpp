// Copying and moving, of which a move that renaming does not do is a copy that takes away.

#include <fcntl.h>
#include <sys/stat.h>

#include "paths/Entries.h"
#include "paths/VirtualPath.h"
#include "work/FileCopy.h"
#include "work/Stop.h"
#include "work/Walks.h"

namespace files {
namespace {

constexpr unsigned kPrivateMode = 0700;  ///< of a folder while it is filled
constexpr unsigned kPermissions = 0777;

/// Gives a folder that was filled the permissions and the time of the one copied.
void keepAttributes(const Folder& to, const std::string& name, const Item& source) {
  Folder made;
  Descriptor folder;
  if (to.Enter(name, made) == Reason::kNone && made.OpenForReading(folder) == Reason::kNone) {
    const timespec times[] = {{0, UTIME_OMIT},
                              {source.mtime, static_cast<long>(source.mtimeNanoseconds)}};
    futimens(folder.Get(), times);
    fchmod(folder.Get(), source.mode & kPermissions);
  }
}

}  // namespace

Transfer::Transfer(const Folder& to, Existing existing, bool isMoving, Report& report)
    : to_(to), existing_(existing), isMoving_(isMoving), report_(report) {
  to_.LookAtItself(target_);
}

bool Transfer::Do(const Stand& stand, const std::string& newName) {
  return Into(stand, to_, newName);
}

bool Transfer::Fail(const Stand& stand, Reason reason) {
  report_.Failed(stand.path, reason);
  return false;
}

bool Transfer::Into(const Stand& stand, const Folder& to, const std::string& newName) {
  report_.Doing(stand.path);
  bool isDone = false;
  if (isMoving_ && (!Rename(stand, to, newName, isDone) || isDone)) {
    return isDone;
  }
  Item item;
  if (const Reason reason = stand.folder.Look(stand.name, item); reason != Reason::kNone) {
    return Fail(stand, reason);
  }
  switch (item.type) {
    case ItemType::kFolder:
      return FolderInto(stand, item, to, newName);
    case ItemType::kMount:
      return Fail(stand, Reason::kMount);
    case ItemType::kSpecial:
      return Fail(stand, Reason::kSpecial);
    default:
      return FileInto(stand, item, to, newName);
  }
}

/// Moves by renaming, if that will do.
/// @return false when it failed
bool Transfer::Rename(const Stand& stand, const Folder& to, const std::string& newName,
                      bool& isDone) {
  Item item;
  Item taken;
  Reason reason = stand.folder.Look(stand.name, item);
  if (reason == Reason::kNone) {
    reason =
        item.type == ItemType::kMount ? Reason::kMount : stand.folder.Move(stand.name, to, newName);
  }
  if (reason == Reason::kExists && existing_ != Existing::kRefuse) {
    reason = to.Look(newName, taken);
    if (reason == Reason::kNone && taken.IsFolder() && item.IsFolder()) {
      return true;  // what is in it is moved
    }
    if (reason == Reason::kNone && existing_ == Existing::kSkip) {
      report_.Skipped();
      isDone = true;
      return true;
    }
    if (reason == Reason::kNone) {
      reason = taken.IsFolder() || item.IsFolder() ? Reason::kExists
                                                   : stand.folder.Replace(stand.name, to, newName);
    }
  }
  if (reason == Reason::kMount && item.type != ItemType::kMount) {
    return true;  // on another file system
  }
  if (reason != Reason::kNone) {
    return Fail(stand, item.IsFolder() && reason == Reason::kFailed ? Reason::kIntoItself : reason);
  }
  report_.DoneBytes(item.size);
  report_.DoneItem();
  isDone = true;
  return true;
}

bool Transfer::FolderInto(const Stand& stand, const Item& item, const Folder& to,
                          const std::string& newName) {
  Item taken;
  Folder from;
  Folder made;
  if (item.IsSameAs(target_)) {
    return Fail(stand, Reason::kIntoItself);
  }
  if (stand.depth >= VirtualPath::kDeepestWalk) {
    return Fail(stand, Reason::kTooDeep);
  }
  Reason reason = stand.folder.Enter(stand.name, from);
  bool isNew = false;
  if (reason == Reason::kNone) {
    reason = to.MakeFolder(newName, kPrivateMode);
    isNew = reason == Reason::kNone;
  }
  if (reason == Reason::kExists && existing_ != Existing::kRefuse) {
    reason = to.Look(newName, taken);
    if (reason == Reason::kNone && (!taken.IsFolder() || taken.IsSameAs(item))) {
      reason = taken.IsFolder() ? Reason::kIntoItself : Reason::kExists;
    }
  }
  if (reason == Reason::kNone) {
    reason = to.Enter(newName, made);
  }
  if (reason != Reason::kNone) {
    return Fail(stand, reason);
  }
  const bool isWhole = Contents(stand, from, made);
  if (isNew) {
    keepAttributes(to, newName, item);
  }
  if (isWhole && isMoving_) {
    reason = stand.folder.RemoveFolder(stand.name);
  }
  if (reason != Reason::kNone) {
    return Fail(stand, reason);
  }
  if (isWhole) {
    report_.DoneItem();
  }
  return isWhole;
}

/// @return whether all that the folder holds was done
bool Transfer::Contents(const Stand& stand, const Folder& from, const Folder& to) {
  Entries entries;
  if (const Reason reason = entries.Open(from); reason != Reason::kNone) {
    return Fail(stand, reason);
  }
  bool isWhole = true;
  std::string name;
  while (!Stop::IsAsked() && entries.Next(name)) {
    if (!isTemporaryName(name)) {
      isWhole = Into(stand.Below(from, name), to, name) && isWhole;
    }
  }
  if (entries.Fault() != Reason::kNone) {
    return Fail(stand, entries.Fault());
  }
  return isWhole && !Stop::IsAsked();
}

bool Transfer::FileInto(const Stand& stand, const Item& item, const Folder& to,
                        const std::string& newName) {
  bool isSkipped = false;
  Item copied = item;
  Reason reason =
      item.IsFile()
          ? copyFile(stand.folder, stand.name, to, newName, existing_, report_, copied, isSkipped)
          : copyLink(stand.folder, stand.name, to, newName, existing_, isSkipped);
  if (Stop::IsAsked()) {
    return false;
  }
  if (reason == Reason::kNone && isMoving_ && !isSkipped) {
    reason = TakeAway(stand, copied);
  }
  if (reason != Reason::kNone) {
    return Fail(stand, reason);
  }
  if (isSkipped) {
    report_.Skipped();
  } else {
    report_.DoneItem();
  }
  return true;
}

/// Removes a file that was copied, unless the name is another's by now or the file has changed.
Reason Transfer::TakeAway(const Stand& stand, const Item& copied) const {
  Item now;
  const Reason reason = stand.folder.Look(stand.name, now);
  if (reason != Reason::kNone) {
    return reason;
  }
  const bool isSame = now.IsSameAs(copied) && now.size == copied.size &&
                      now.mtime == copied.mtime && now.mtimeNanoseconds == copied.mtimeNanoseconds;
  return isSame ? stand.folder.RemoveFile(stand.name) : Reason::kChanged;
}

}  // namespace files
