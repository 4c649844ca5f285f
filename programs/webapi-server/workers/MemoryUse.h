#pragma once

#include <cstddef>

namespace QELO {

/// Bytes of memory that the process has for itself, as far as it can be told; 0: not at all.
size_t OwnMemory();

}  // namespace QELO
