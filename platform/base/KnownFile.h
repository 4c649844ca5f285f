#pragma once

#include <sys/stat.h>

#include <memory>

namespace QELO::Platform {

/// What a file holds, kept by the process until the file changes: one request asks a dozen times.
/// @tparam Content  made from the path; by default what a missing file holds
template <typename Content>
class KnownFile {
 public:
  /// @param path  must outlive the object
  explicit KnownFile(const char* path) : path_(path) {}

  std::shared_ptr<const Content> Get() {
    struct stat now {};
    const bool there = stat(path_, &now) == 0;
    if (!there) {
      now = {};
    }
    // A file that is replaced has another inode; one that is written, or whose mode is changed,
    // another time of change.
    if (content_ == nullptr || now.st_ino != known_.st_ino || now.st_dev != known_.st_dev ||
        now.st_size != known_.st_size || now.st_ctim.tv_sec != known_.st_ctim.tv_sec ||
        now.st_ctim.tv_nsec != known_.st_ctim.tv_nsec) {
      content_ = there ? std::make_shared<const Content>(path_) : std::make_shared<const Content>();
      known_ = now;
    }
    return content_;
  }

 private:
  const char* path_;
  struct stat known_ {};
  std::shared_ptr<const Content> content_;
};

}  // namespace QELO::Platform
