#pragma once

namespace QELO::Platform {

/// Takes an exclusive lock on an open file.
/// @param seconds  how long to wait at most; 0: one try
bool lockFile(int file, int seconds);

}  // namespace QELO::Platform
