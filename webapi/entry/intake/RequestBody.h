#pragma once

#include <cstdint>
#include <string>

#include "webapi/base/Pace.h"

namespace QELO::RequestBody {

/// Longest body in bytes that is taken as parameters: they are kept in memory, several times over
/// while they are read, and nobody has been asked for a permission yet.
inline constexpr int64_t kMaxLength = 16 << 20;

/// Reads a body of `length` bytes and takes the text up to its first NUL. A body that ends or
/// stalls early, or comes too slowly, is taken as far as it came; memory is used for what came, not
/// for `length`.
/// @param length  bytes announced, above 0
/// @return false, and `text` unchanged, when memory is short or `fd` cannot be read
bool Read(int fd, int64_t length, const PaceLimits& limits, std::string& text);

/// Makes /dev/null the process's standard input. Stays as it is when /dev/null cannot be opened.
void CloseStandardInput();

}  // namespace QELO::RequestBody
