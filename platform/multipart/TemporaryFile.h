#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Whose temporary files are to be.
struct FileOwner {
  uid_t uid;
  gid_t gid;
};

/// What the names of temporary files of uploads start with.
inline constexpr char kTemporaryPrefix[] = "webapi-upload-";

/// A directory that temporary files go into.
class TemporaryFolder {
 public:
  /// @return false, with errno, when it is no directory in which a file is safe from others: it
  ///         belongs to root or to the effective user, and where more than its owner may write, a
  ///         file's owner alone may remove it (the sticky bit)
  bool Open(const char* path);

  int Descriptor() const { return directory_.Get(); }
  const std::string& Path() const { return path_; }

  /// Removes what processes left behind that ended before they could: temporary files that nobody
  /// has locked any more. Looks at a part of a directory that holds very many files.
  void Sweep() const;

 private:
  std::string path_;
  UniqueFd directory_;
};

/// One file that is received. It has no name until Keep(), so that nothing is left of it when the
/// process is killed; afterwards it is removed with this object, by the process that made it.
/// Locked all the while, to tell it from what Sweep() is for.
class TemporaryFile {
 public:
  /// @param owner  whose the file is to be; none: the effective user's
  /// @return null, with errno, when it cannot be made
  static std::unique_ptr<TemporaryFile> Create(std::shared_ptr<const TemporaryFolder> folder,
                                               const std::optional<FileOwner>& owner);
  /// Makes one of a file that has a name in the folder, which it changes.
  /// @return null, with errno; the file is then as it was, or its owner's
  static std::unique_ptr<TemporaryFile> Adopt(std::shared_ptr<const TemporaryFolder> folder,
                                              UniqueFd file, const std::string& name,
                                              const std::optional<FileOwner>& owner);
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;
  ~TemporaryFile();

  /// @return false, with errno, when not all could be written
  bool Write(std::string_view bytes) const;
  /// Gives the file a name that nobody can guess. @return false, with errno
  bool Keep();
  /// "" without a name.
  const std::string& Path() const { return path_; }

 private:
  TemporaryFile(std::shared_ptr<const TemporaryFolder> folder, UniqueFd file);

  std::shared_ptr<const TemporaryFolder> folder_;
  UniqueFd file_;
  std::string name_;
  std::string path_;
  pid_t maker_;
};

}  // namespace QELO::Platform
