#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>

#include "platform/multipart/PartialFile.h"
#include "platform/multipart/Upload.h"

namespace QELO::Platform {

/// The slice that a request has, and the file that it is a part of.
class SliceIntake {
 public:
  /// Whether the request's file is a slice. Without a word of which one of what, it is a whole one.
  static bool IsAsked();

  /// Whose files are added to; none: nobody's. What is open is let go.
  void SetCaller(std::optional<uid_t> caller);
  /// Opens the file, if it is not open yet, as far as the account may that the process has now.
  /// @return 0, or a negative QeloUploadResult
  int Open();
  /// Adds the file that was found in the body.
  /// @param directory  where the whole is begun
  /// @param owner      whose the whole is to be
  /// @param whole      receives that, when this was the rest of it
  /// @return the upload's result
  int Add(Upload& upload, const char* directory, const std::optional<FileOwner>& owner,
          std::unique_ptr<TemporaryFile>& whole);
  bool HasAdded() const { return hasAdded_; }
  /// Leaves the file to other requests.
  void LetGo() { file_.reset(); }
  /// Another request begins, of the same caller.
  void Reset();

  /// What the request says of it; none when that makes no sense, or before Open().
  const std::optional<Slice>& Said() const { return said_; }
  /// Bytes that there are of the file.
  uint64_t Received() const { return received_; }

 private:
  std::optional<uid_t> caller_;
  std::optional<Slice> said_;
  std::unique_ptr<PartialFile> file_;
  uint64_t received_ = 0;
  int fault_ = 0;  ///< why there is no file
  bool hasAdded_ = false;
};

}  // namespace QELO::Platform
