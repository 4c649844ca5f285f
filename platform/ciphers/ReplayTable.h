#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace QELO::Platform {

/// The marks of envelopes that were opened lately, for all processes: a file of fixed size in
/// /run/webapi/ciphers. A mark is forgotten when its envelope is too old to be opened anyway.
class ReplayTable {
 public:
  static constexpr size_t kMarkSize = 24;    ///< bytes of a mark that are kept
  static constexpr size_t kBuckets = 4096;   ///< a mark has its place in one of them
  static constexpr size_t kBucketSize = 16;  ///< marks that one holds

  /// Enters a mark.
  /// @param mark   kMarkSize bytes at least, which nobody can choose at will
  /// @param until  when it may be forgotten, in seconds since the epoch
  /// @return false when it is there already, there is no room for it, or the table cannot be used
  static bool Enter(std::string_view mark, int64_t now, int64_t until);
};

}  // namespace QELO::Platform
