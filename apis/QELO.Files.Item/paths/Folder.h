#pragma once

#include <string>

#include "paths/Descriptor.h"
#include "paths/Item.h"
#include "paths/Reason.h"
#include "paths/Shares.h"

namespace files {

/// A folder within a shared folder, held open: whatever becomes of its name meanwhile, all that is
/// done goes on in it. Nothing leads out of it: no "..", no link, nothing that is mounted.
///
/// Names are single parts of a path unless it says otherwise. Outputs are set on success alone.
class Folder {
 public:
  Folder() = default;

  /// The shared folder itself. Its path on the host must lead through folders alone, without links.
  /// @return kNone or kShareBroken, kDenied for who may not enter it
  static Reason OpenShare(const Share& share, Folder& folder);

  /// @param below  of several parts, as VirtualPath::Below() gives it
  Reason Enter(const std::string& below, Folder& folder) const;
  /// A descriptor by which its names can be read.
  Reason OpenForReading(Descriptor& descriptor) const;

  /// What the name stands for; a link is looked at, not followed.
  Reason Look(const std::string& name, Item& item) const;
  Reason LookAtItself(Item& item) const;
  /// Opens a regular file for reading. Nothing else is opened, so that no device starts to work and
  /// no pipe is waited for.
  /// @param item  the file that was opened, whatever the name stands for by now
  Reason OpenFile(const std::string& name, Descriptor& file, Item& item) const;

  /// @param mode  before the process's mask
  Reason MakeFolder(const std::string& name, unsigned mode) const;
  /// Moves an item; what has the new name already stays, and the answer is kExists.
  Reason Move(const std::string& name, const Folder& to, const std::string& newName) const;
  /// As Move(), and a file takes the place of a file.
  Reason Replace(const std::string& name, const Folder& to, const std::string& newName) const;
  /// Takes a name away: of a folder that is empty, or of anything else.
  Reason RemoveFolder(const std::string& name) const;
  Reason RemoveFile(const std::string& name) const;

  int Get() const { return folder_.Get(); }

 private:
  Descriptor folder_;
};

}  // namespace files
