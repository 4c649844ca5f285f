#pragma once

#include <atomic>

namespace QELO {

/// What a serving process tells the server, in memory that both have. Foreign code runs in that
/// process, so nothing here may be trusted for more than a log line.
struct Note {
  char call[160];         ///< what was called, with a NUL
  char user[64];          ///< for whom
  std::atomic<int> code;  ///< error code of the answer
};

}  // namespace QELO
