#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace QELO::Platform {

/// A file of `key="value"` lines, read once.
///
/// The quotes may be left out; an unquoted value ends before a blank and a "#". A line that starts
/// with "#" is a comment. Of several lines with one key the last counts.
class KeyValueFile {
 public:
  /// Larger files, in bytes, are taken for empty, as are files that cannot be read.
  static constexpr size_t kMaxSize = 1 << 20;

  KeyValueFile() = default;
  explicit KeyValueFile(const char* path);
  KeyValueFile(const KeyValueFile&) = delete;
  KeyValueFile& operator=(const KeyValueFile&) = delete;

  /// @return false, and `value` unchanged, when the key is not there
  bool Get(std::string_view key, std::string& value) const;

 private:
  std::string text_;
  /// Names and values within the text, in the order of the lines.
  std::vector<std::pair<std::string_view, std::string_view>> lines_;
};

}  // namespace QELO::Platform
