#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string_view>
#include <vector>

namespace QELO::Platform {

/// Bytes of a content, both ends included.
struct Range {
  off_t first;
  off_t last;
  off_t Length() const { return last - first + 1; }
};

/// Ranges that one request may ask for; a reader of documents asks for a dozen.
inline constexpr size_t kMostRanges = 64;

enum class Wanted {
  kWhole,  ///< no ranges, or a request for some that is malformed or has too many
  kRanges,
  kNothing  ///< none of the ranges is within the content
};

/// What the header "Range" asks for. What overlaps or touches comes once, so that all ranges
/// together are never more than the content.
/// @param size    of the content; of an empty one the whole is wanted
/// @param ranges  receives, for kRanges, the ranges in the order of the request
Wanted readRanges(std::string_view header, off_t size, std::vector<Range>& ranges);

}  // namespace QELO::Platform
