#pragma once

#include <unistd.h>

#include <utility>

namespace files {

/// Owns a descriptor and closes it.
class Descriptor {
 public:
  explicit Descriptor(int fd = -1) : fd_(fd) {}
  Descriptor(Descriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  ~Descriptor() {
    if (fd_ >= 0) {
      close(fd_);
    }
  }

  int Get() const { return fd_; }
  explicit operator bool() const { return fd_ >= 0; }
  /// Hands it on to the caller.
  int Release() { return std::exchange(fd_, -1); }

 private:
  int fd_;
};

}  // namespace files
