#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "programs/webapi-exec/transfer/SentSlice.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::ExecProgram {

/// Files as the body of a form (multipart/form-data), which a process of its own writes to standard
/// input while the call reads it.
class UploadBody {
 public:
  UploadBody();
  UploadBody(const UploadBody&) = delete;
  UploadBody& operator=(const UploadBody&) = delete;
  /// Ends the process.
  ~UploadBody();

  /// @param files  fields and paths of regular files
  /// @return what is wrong, or ""
  std::string Open(const std::vector<std::pair<std::string, std::string>>& files);
  /// A file that is alone goes on where a call before this one was ended.
  /// @param call  what is called
  void Resume(uid_t caller, const std::string& call);
  bool IsEmpty() const { return parts_.empty(); }
  std::string Type() const { return "multipart/form-data; boundary=" + boundary_; }
  uint64_t Length() const;
  /// Bytes that need not be sent.
  uint64_t There() const { return slice_.There(); }
  /// What a request with the body says, as CGI variables.
  Json::Value Request() const;

  /// Begins to write, with the progress on the terminal. The process environment tells of the body
  /// from then on.
  /// @return false, with errno, when that cannot be
  bool Start();

 private:
  struct Part {
    std::string head;
    UniqueFd file;
    off_t start = 0;  ///< of what is sent
    off_t length = 0;
  };

  [[noreturn]] void Write(int pipe) const;

  std::string boundary_;
  std::vector<Part> parts_;
  SentSlice slice_;
  pid_t process_ = -1;
};

}  // namespace QELO::ExecProgram
