#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/multipart/TemporaryFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// What a request says of its slice: a part of one large file, which comes in several requests.
struct Slice {
  std::string id;       ///< the client's own name for the file
  uint64_t size = 0;    ///< bytes of the whole file
  uint64_t offset = 0;  ///< where the slice starts
};

/// Reads the headers X-UPLOAD-ID, X-FILE-SIZE and X-SLICE-OFFSET of the process's environment.
/// @return nothing when the id is not of 16 to 64 letters, digits, "-" and "_", or a number is none
std::optional<Slice> readSlice();

/// A file of which slices have come, from one request to the next: the file itself, private and
/// with a name that nobody can guess, and a record of where it is in a directory of root's. Locked
/// while it is open, so that one request at a time adds to it.
class PartialFile {
 public:
  /// How long a file waits for its next slice.
  static constexpr long kLongestWait = 24 * 60 * 60;  ///< seconds
  /// Files that one caller may have begun.
  static constexpr int kMostOfACaller = 16;

  /// Opens the file that a caller has begun, or begins it; and removes those that waited too long.
  /// @param directory  where it is begun; null: it is not
  /// @param received   receives how many bytes there are, 0 without a file
  /// @param file       receives it when the slice follows what there is, or `directory` is null
  /// @return 0, or a negative QeloUploadResult
  static int Open(uid_t caller, const Slice& slice, const char* directory, uint64_t& received,
                  std::unique_ptr<PartialFile>& file);

  /// @return 0, or a negative QeloUploadResult; what was written stays
  int Write(std::string_view bytes);
  uint64_t Received() const { return received_; }
  bool IsWhole() const { return received_ == size_; }
  /// Makes a temporary file of it. REQUIRES: IsWhole(). @return null, with errno
  std::unique_ptr<TemporaryFile> Finish(const std::optional<FileOwner>& owner);

 private:
  PartialFile(UniqueFd record, std::string recordName, uint64_t size)
      : record_(std::move(record)), recordName_(std::move(recordName)), size_(size) {}

  int Begin(int records, const char* directory);
  bool Continue();
  void Forget(int records) const;

  UniqueFd record_;
  std::string recordName_;
  uint64_t size_;
  uint64_t received_ = 0;
  std::shared_ptr<const TemporaryFolder> folder_;
  std::string name_;
  UniqueFd file_;
};

}  // namespace QELO::Platform
