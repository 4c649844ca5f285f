#pragma once

#include <algorithm>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/multipart/Disposition.h"

namespace QELO::Platform {

/// Takes a body of the type multipart/form-data (RFC 7578) apart while it arrives, in a buffer of
/// fixed size. The boundary is searched for by the C library's memmem, which looks at a fraction of
/// the bytes.
class PartReader {
 public:
  /// Bytes of the buffer: what one read and one write move.
  static constexpr size_t kBufferSize = 256 << 10;

  /// Reads up to `size` bytes. @return how many; 0 at the end of the body; a negative
  /// QeloUploadResult on failure
  using Source = std::function<int64_t(char* buffer, size_t size)>;
  /// Takes the next bytes of a part's content. @return 0, or a negative QeloUploadResult, which
  /// ends the reading
  using Sink = std::function<int(std::string_view bytes)>;

  /// @param boundary  not empty, without line ends
  /// @param bufferSize  more than a header and the longest boundary together
  PartReader(const std::string& boundary, Source source, size_t bufferSize = kBufferSize);

  /// Goes on to the next part, behind the content of the one before, which has been read.
  /// @param isEnd  receives whether there is none
  /// @return 0, or a negative QeloUploadResult; `header` is unchanged at the end
  int Next(PartHeader& header, bool& isEnd);
  /// Reads the content of the part that Next() has found, once. @return as Next()
  int ReadContent(const Sink& sink);

  /// Bytes of the body that have been taken apart.
  uint64_t Position() const { return received_ - std::min<uint64_t>(received_, end_ - begin_); }

 private:
  enum class Mark { kNone, kPart, kEnd, kCut };

  Mark MarkAt(size_t at, size_t& length) const;
  int ReadMark(const Sink& sink);
  int PassOn(size_t end, const Sink& sink);
  int Fill();
  size_t Offset(const void* place) const {
    return static_cast<size_t>(static_cast<const char*>(place) - buffer_.get());
  }
  std::string_view Held() const { return {buffer_.get() + begin_, end_ - begin_}; }

  const std::string mark_;  ///< a line end, "--" and the boundary
  Source source_;
  const size_t size_;
  std::unique_ptr<char[]> buffer_;
  size_t begin_ = 0;
  size_t end_;
  uint64_t received_ = 0;
  bool isStarted_ = false;
  bool isOver_ = false;  ///< the closing boundary was read
};

}  // namespace QELO::Platform
