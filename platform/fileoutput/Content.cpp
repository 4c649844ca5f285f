#include "platform/fileoutput/Content.h"

#include <fcntl.h>
#include <stdio_ext.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>

#include "webapi/base/Hex.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

/// Seconds after a change within which another one might leave the same time behind: the kernel's
/// clock for files has steps, and that of some file systems whole seconds.
constexpr time_t kUnsettled = 2;

/// FNV-1a of some numbers.
uint64_t mix(std::initializer_list<uint64_t> numbers) {
  constexpr uint64_t kPrime = 0x100000001b3;
  uint64_t hash = 0xcbf29ce484222325;
  for (uint64_t number : numbers) {
    for (size_t byte = 0; byte < sizeof number; ++byte, number >>= 8U) {
      hash = (hash ^ (number & 0xffU)) * kPrime;
    }
  }
  return hash;
}

std::string hexText(uint64_t number) {
  std::string text;
  for (int shift = 56; shift >= 0; shift -= 8) {
    AppendHex(static_cast<unsigned char>(number >> static_cast<unsigned>(shift)), kLowerHex, text);
  }
  return text;
}

}  // namespace

int Content::OpenFile(const std::string& path) {
  if (path.empty() || path.find('\0') != std::string::npos) {
    return path.empty() ? ENOENT : EINVAL;
  }
  const int error = OpenRegularFile(AT_FDCWD, path.c_str(), file_, info_, 0);
  if (error == 0) {
    isFile_ = true;
    length_ = info_.st_size;
  }
  return error;
}

int Content::TakeStream(std::FILE* stream) {
  if (stream == nullptr) {
    return EINVAL;
  }
  if (__freadable(stream) == 0) {
    return EBADF;
  }
  if (__fwriting(stream) != 0 && fflush(stream) != 0) {
    return errno;
  }
  stream_ = stream;
  const int descriptor = fileno(stream);
  if (descriptor < 0 || fstat(descriptor, &info_) != 0 || !S_ISREG(info_.st_mode)) {
    return 0;
  }
  const off_t position = ftello(stream);
  if (position >= 0) {
    isFile_ = true;
    start_ = std::min(position, info_.st_size);
    length_ = info_.st_size - start_;
  }
  return 0;
}

Validators Content::GetValidators() const {
  if (!isFile_) {
    return {};
  }
  const timespec& changed = info_.st_mtim;
  const time_t now = time(nullptr);
  const uint64_t state = mix({info_.st_ino, static_cast<uint64_t>(changed.tv_sec),
                              static_cast<uint64_t>(changed.tv_nsec),
                              static_cast<uint64_t>(info_.st_size), static_cast<uint64_t>(start_)});
  const bool isSettled = changed.tv_sec + kUnsettled <= now;
  // A time in the future is no time of a change yet.
  return {(isSettled ? "\"" : "W/\"") + hexText(state) + '"', std::min(changed.tv_sec, now),
          isSettled};
}

}  // namespace QELO::Platform
