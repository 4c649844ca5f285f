#pragma once

#include <cstdint>

namespace QELO {

/// How many bytes of its request's body the process has taken from standard input. Who reads some
/// adds them, so that dropping the rest stops where the body does: a web server may leave the input
/// open.
inline int64_t& TakenBodyBytes() {
  static int64_t bytes = 0;
  return bytes;
}

}  // namespace QELO
