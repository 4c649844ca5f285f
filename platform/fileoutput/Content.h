#pragma once

#include <sys/stat.h>

#include <cstdio>
#include <string>

#include "platform/fileoutput/Conditions.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// What is sent: a part of a regular file, or what a stream still has.
class Content {
 public:
  /// @return 0, or the errno of the failure; EINVAL for what is no regular file
  int OpenFile(const std::string& path);
  int TakeStream(std::FILE* stream);

  bool IsFile() const { return isFile_; }
  bool IsWholeFile() const { return isFile_ && start_ == 0; }
  off_t Length() const { return length_; }  ///< of a file's part
  Validators GetValidators() const;
  const struct stat& Status() const { return info_; }
  int Descriptor() const { return file_ ? file_.Get() : fileno(stream_); }
  std::FILE* Stream() const { return stream_; }
  off_t Start() const { return start_; }

 private:
  UniqueFd file_;
  std::FILE* stream_ = nullptr;
  bool isFile_ = false;
  struct stat info_ {};
  off_t start_ = 0;
  off_t length_ = 0;
};

}  // namespace QELO::Platform
