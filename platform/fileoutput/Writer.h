#pragma once

#include <sys/types.h>

#include <cstdio>
#include <string_view>

#include "webapi/base/Pace.h"

namespace QELO::Platform {

/// Writes an answer to standard output, behind what the process has printed before. That the client
/// is gone makes an operation fail; anything else that does is logged. So is a client that takes
/// the answer more slowly than the settings allow.
///
/// While it lives, writing to standard output does not wait, where that is a pipe or a socket.
class Writer {
 public:
  Writer();
  Writer(const Writer&) = delete;
  Writer& operator=(const Writer&) = delete;
  ~Writer();

  bool WriteText(std::string_view text);
  /// Sends a part of a regular file without copying it through the process.
  bool SendFile(int file, off_t start, off_t length);
  /// Sends what a stream has until its end.
  /// @param length  0 or more: so many bytes of it, fewer are a failure; negative: all
  bool SendStream(std::FILE* stream, off_t length);

 private:
  bool CopyFile(int file, off_t start, off_t length);
  bool AwaitRoom();

  int flags_;  ///< of standard output, that it had before; negative: they have not been changed
  Pace pace_;
};

}  // namespace QELO::Platform
