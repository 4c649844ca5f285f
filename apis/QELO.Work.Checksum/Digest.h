#pragma once

#include <cstdint>
#include <functional>
#include <string>

namespace checksum {

/// The SHA-256 of a regular file's content.
/// @param progress  called after each piece with its bytes
/// @param digest    receives 64 hexadecimal digits on success
/// @return 0, or errno; ELOOP and EINVAL when it is no regular file any more
int digestOf(const std::string& path, const std::function<void(uint64_t)>& progress,
             std::string& digest);

}  // namespace checksum
