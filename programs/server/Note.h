#pragma once

#include <atomic>
#include <cstdint>

namespace QELO {

/// What a serving process tells the server, in memory that both have. Foreign code runs in that
/// process, so nothing here may be trusted for more than a log line.
struct Note {
  char call[160];                 ///< what was called, with a NUL
  char user[64];                  ///< for whom
  std::atomic<int> code;          ///< error code of the answer
  std::atomic<uint64_t> written;  ///< bytes that it wrote to elsewhere than the client
  std::atomic<bool> isStale;      ///< it found something changed that the server keeps
};

}  // namespace QELO
