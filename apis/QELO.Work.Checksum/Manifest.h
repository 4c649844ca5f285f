#pragma once

#include <string>

namespace checksum {

/// Digests and names in the form that "sha256sum --check" reads, one line a file, up to a limit.
class Manifest {
 public:
  static constexpr size_t kLimit = 1 << 20;  ///< bytes: a task's record is no place for more

  /// Lines beyond the limit are dropped, and all that follow.
  void Add(const std::string& digest, const std::string& name);
  const std::string& Text() const { return text_; }
  bool IsComplete() const { return complete_; }

 private:
  std::string text_;
  bool complete_ = true;
};

}  // namespace checksum
