#pragma once

#include <sys/stat.h>
#include <sys/types.h>

namespace QELO {

/// Which file a descriptor led to at one time. Foreign code may close descriptors that it did not
/// open, and what it opens next takes their numbers.
class FileIdentity {
 public:
  FileIdentity() = default;
  explicit FileIdentity(int descriptor) {
    struct stat info {};
    if (fstat(descriptor, &info) == 0) {
      device_ = info.st_dev;
      inode_ = info.st_ino;
      isKnown_ = true;
    }
  }

  /// Whether the descriptor leads there. A file that could not be looked at is never found again.
  bool IsAt(int descriptor) const {
    const FileIdentity other(descriptor);
    return isKnown_ && other.isKnown_ && device_ == other.device_ && inode_ == other.inode_;
  }

 private:
  dev_t device_ = 0;
  ino_t inode_ = 0;
  bool isKnown_ = false;
};

}  // namespace QELO
