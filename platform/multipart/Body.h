#pragma once

#include <cstddef>
#include <cstdint>

#include "webapi/base/Pace.h"

namespace QELO::Platform {

/// The body of a request on a descriptor: as many bytes as were announced.
class Body {
 public:
  /// @param limits  how slow the client may be
  Body(int descriptor, uint64_t length, const PaceLimits& limits);

  /// Reads some. @return how many bytes; 0 when all announced ones have been read; a negative
  /// QeloUploadResult when the client broke off, stalls, or the descriptor cannot be read
  int64_t Read(char* buffer, size_t size);

  uint64_t Length() const { return length_; }
  uint64_t Received() const { return length_ - left_; }

 private:
  int descriptor_;
  uint64_t length_;
  uint64_t left_;
  Pace pace_;
  bool mayBlock_;  ///< a pipe or a socket, at whose other end somebody may stall
};

}  // namespace QELO::Platform
