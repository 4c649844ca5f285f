#pragma once

#include <dirent.h>

#include <memory>
#include <string>

#include "paths/Folder.h"

namespace files {

/// The names in a folder, one after the other, as the file system keeps them.
class Entries {
 public:
  Reason Open(const Folder& folder);
  /// @return false at the end, and when the folder cannot be read any further
  bool Next(std::string& name);
  /// From the first name again.
  void Rewind();
  /// Why Next() ended early; kNone when it did not.
  Reason Fault() const { return fault_; }

 private:
  struct Close {
    void operator()(DIR* stream) const { closedir(stream); }
  };

  std::unique_ptr<DIR, Close> stream_;
  Reason fault_ = Reason::kNone;
};

}  // namespace files
