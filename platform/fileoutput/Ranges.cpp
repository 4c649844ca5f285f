#include "platform/fileoutput/Ranges.h"

#include <strings.h>

#include <algorithm>
#include <limits>

#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr std::string_view kUnit = "bytes=";
constexpr off_t kHighest = std::numeric_limits<off_t>::max();

/// Reads digits; a number beyond the highest is the highest.
bool readNumber(std::string_view text, off_t& number) {
  if (text.empty() || !std::all_of(text.begin(), text.end(), IsDigit)) {
    return false;
  }
  number = 0;
  for (const char digit : text) {
    const off_t value = digit - '0';
    if (number > (kHighest - value) / 10) {
      number = kHighest;
      return true;
    }
    number = number * 10 + value;
  }
  return true;
}

/// Reads "first-last", "first-" or "-length".
/// @param range  receives the part within the content; `first` behind it when there is none
/// @return false when the text is none of them
bool readRange(std::string_view text, off_t size, Range& range) {
  const size_t dash = text.find('-');
  if (dash == std::string_view::npos) {
    return false;
  }
  const std::string_view before = text.substr(0, dash);
  const std::string_view after = text.substr(dash + 1);
  off_t last = kHighest;
  if (before.empty()) {
    off_t length = 0;
    if (!readNumber(after, length)) {
      return false;
    }
    range = {length > 0 ? std::max<off_t>(size - length, 0) : size, size - 1};
    return true;
  }
  if (!readNumber(before, range.first) || (!after.empty() && !readNumber(after, last)) ||
      last < range.first) {
    return false;
  }
  range.last = std::min(last, size - 1);
  return true;
}

/// Adds a range, in one with those that it overlaps or touches.
void join(Range range, std::vector<Range>& ranges) {
  const auto touches = [&range](const Range& other) {
    return other.first <= range.last + 1 && range.first <= other.last + 1;
  };
  auto place = std::find_if(ranges.begin(), ranges.end(), touches);
  if (place == ranges.end()) {
    ranges.push_back(range);
    return;
  }
  const auto index = place - ranges.begin();
  while (place != ranges.end()) {
    range = {std::min(range.first, place->first), std::max(range.last, place->last)};
    ranges.erase(place);
    place = std::find_if(ranges.begin(), ranges.end(), touches);
  }
  ranges.insert(ranges.begin() + index, range);
}

}  // namespace

Wanted readRanges(std::string_view header, off_t size, std::vector<Range>& ranges) {
  ranges.clear();
  if (size <= 0 || header.size() < kUnit.size() ||
      strncasecmp(header.data(), kUnit.data(), kUnit.size()) != 0) {
    return Wanted::kWhole;
  }
  header.remove_prefix(kUnit.size());
  size_t count = 0;
  while (!header.empty()) {
    const std::string_view piece = Trim(TakePiece(header, ","));
    if (piece.empty()) {
      continue;
    }
    Range range{};
    if (++count > kMostRanges || !readRange(piece, size, range)) {
      ranges.clear();
      return Wanted::kWhole;
    }
    if (range.first < size) {
      join(range, ranges);
    }
  }
  if (count == 0) {
    return Wanted::kWhole;
  }
  return ranges.empty() ? Wanted::kNothing : Wanted::kRanges;
}

}  // namespace QELO::Platform
