#pragma once

#include <string>

#include "paths/Descriptor.h"
#include "paths/Folder.h"

namespace files {

/// What becomes of an item whose name is taken.
enum class Existing { kRefuse, kReplace, kSkip };

/// A file that gets its name when it is whole, so that nobody ever finds half of it.
///
/// Until then it has none, where the file system can do that, and is gone with the process; else
/// one of the API's own.
class NewFile {
 public:
  NewFile() = default;
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;
  ~NewFile();

  /// Makes it in the folder, which must outlive this, with the permissions of a new file.
  Reason Make(const Folder& folder);
  /// To write by.
  int Get() const { return file_.Get(); }

  /// Gives it its name, in one step: who looks finds what was there before or all of this.
  /// @param existing   of a file or link that has the name; a folder is always refused
  /// @param isSkipped  set to true when it was dropped in favour of what is there
  Reason Finish(const std::string& name, Existing existing, bool& isSkipped);

 private:
  Reason Replace(const std::string& name);

  const Folder* folder_ = nullptr;
  Descriptor file_;
  std::string temporaryName_;  ///< "" for a file without a name
};

/// A name for a file that is not finished, which nobody can guess.
std::string temporaryName();

}  // namespace files
