#pragma once

#include <sys/types.h>
#include <unistd.h>

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
///
/// Once open, it may be gone on with by another account, whose file it is then: that of a method
/// that receives its upload itself.
class PartialFile {
 public:
  /// How long a file waits for its next slice.
  static constexpr long kLongestWait = 24 * 60 * 60;  ///< seconds
  /// Files that one caller may have begun.
  static constexpr int kMostOfACaller = 16;

  /// Opens what there is of a caller's file, if only the room for it; and removes files that waited
  /// too long.
  /// @param file  null on failure
  /// @return 0, or a negative QeloUploadResult
  static int Open(uid_t caller, const Slice& slice, std::unique_ptr<PartialFile>& file);
  PartialFile(const PartialFile&) = delete;
  PartialFile& operator=(const PartialFile&) = delete;
  /// Takes the record away where nothing has come of the file, or all of it. A process that has
  /// given up the right to do so leaves it empty, for Open() of a later one.
  ~PartialFile();

  /// Begins the file, or goes on with it.
  /// @param directory  where it is begun
  /// @return 0, or a negative QeloUploadResult, as when the slice does not start where it ends
  int GoOn(uint64_t offset, const char* directory);
  /// @return 0, or a negative QeloUploadResult; what was written stays
  int Write(std::string_view bytes);
  uint64_t Received() const { return received_; }
  bool IsWhole() const { return received_ == size_; }
  /// Makes a temporary file of it. REQUIRES: IsWhole(). @return null, with errno
  std::unique_ptr<TemporaryFile> Finish(const std::optional<FileOwner>& owner);

 private:
  PartialFile(UniqueFd records, UniqueFd record, std::string recordName, uint64_t size)
      : records_(std::move(records)),
        record_(std::move(record)),
        recordName_(std::move(recordName)),
        size_(size),
        opener_(getpid()) {}

  int Begin(const char* directory);
  bool FindBytes();
  void Forget() const;

  UniqueFd records_;  ///< their directory
  UniqueFd record_;
  std::string recordName_;
  uint64_t size_;
  uint64_t received_ = 0;
  std::shared_ptr<const TemporaryFolder> folder_;
  std::string name_;
  UniqueFd file_;
  uid_t fileOwner_ = 0;
  bool isOneTooMany_ = false;  ///< the caller has begun as many as there may be
  pid_t opener_;
};

}  // namespace QELO::Platform
