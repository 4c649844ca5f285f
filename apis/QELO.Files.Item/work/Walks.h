#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "paths/Folder.h"
#include "paths/NewFile.h"
#include "work/Report.h"

namespace files {

/// An item that a walk has come to: by the folder that holds it, and as clients call it.
struct Stand {
  const Folder& folder;
  std::string name;
  std::string path;
  unsigned depth = 0;  ///< folders below the item that the walk began with

  Stand Below(const Folder& inner, const std::string& child) const {
    return {inner, child, path + "/" + child, depth + 1};
  }
};

/// Counts an item and all below it. What cannot be looked at counts for nothing here.
/// @param found  told the bytes of each; false ends the counting
/// @return false when it was ended
bool countItems(const Stand& stand, const std::function<bool(uint64_t)>& found);

/// Removes an item, a folder with all that is in it. What was met and could not be removed stays,
/// and the report says why.
/// @return whether all of it is gone
bool removeItem(const Stand& stand, Report& report);

/// Copies or moves items into one folder. A folder whose name is taken by a folder is refused, or
/// what it holds goes into that.
class Transfer {
 public:
  /// @param to        the folder that the items go into; must outlive this
  /// @param isMoving  items are taken away from where they were
  Transfer(const Folder& to, Existing existing, bool isMoving, Report& report);

  /// @return whether all of it was done
  bool Do(const Stand& stand, const std::string& newName);

 private:
  bool Into(const Stand& stand, const Folder& to, const std::string& newName);
  bool Rename(const Stand& stand, const Folder& to, const std::string& newName, bool& isDone);
  bool FolderInto(const Stand& stand, const Item& item, const Folder& to,
                  const std::string& newName);
  bool Contents(const Stand& stand, const Folder& from, const Folder& to);
  bool FileInto(const Stand& stand, const Item& item, const Folder& to, const std::string& newName);
  Reason TakeAway(const Stand& stand, const Item& copied) const;
  bool Fail(const Stand& stand, Reason reason);

  const Folder& to_;
  Existing existing_;
  bool isMoving_;
  Report& report_;
  Item target_;  ///< the folder that the items go into
};

}  // namespace files
