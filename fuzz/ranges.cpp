// What a download makes of the texts that a client sends or names: a header "Range", whatever it
// is, asks for parts of the content and for no more than that; a date is the one that is written
// again; a file's name adds no header line.
//
// An input's first eight bytes are the content's size; the rest is the text.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "platform/fileoutput/HttpDate.h"
#include "platform/fileoutput/Ranges.h"
#include "webapi/platform/FileOutput.h"

namespace {

using namespace QELO::Platform;

void require(bool isTrue, const char* what) {
  if (!isTrue) {
    fprintf(stderr, "wrong: %s\n", what);
    abort();
  }
}

void askFor(std::string_view header, off_t size) {
  std::vector<Range> ranges;
  if (readRanges(header, size, ranges) != Wanted::kRanges) {
    return;
  }
  require(!ranges.empty() && ranges.size() <= kMostRanges, "a number of ranges");
  for (const Range& range : ranges) {
    require(0 <= range.first && range.first <= range.last && range.last < size, "a range");
  }
  std::sort(ranges.begin(), ranges.end(),
            [](const Range& a, const Range& b) { return a.first < b.first; });
  for (size_t at = 1; at < ranges.size(); ++at) {
    require(ranges[at - 1].last + 1 < ranges[at].first, "ranges that overlap or touch");
  }
}

void readDate(std::string_view text) {
  time_t time = -1;
  time_t again = -1;
  if (parseHttpDate(text, time)) {
    require(parseHttpDate(formatHttpDate(time), again) && again == time, "a date");
  }
}

void name(const std::string& text) {
  for (const bool isInline : {false, true}) {
    const std::string value = QELO::HTTP::FileOutputerHelper::ContentDisposition(text, isInline);
    require(std::all_of(value.begin(), value.end(), [](char c) { return ' ' <= c && c <= '~'; }),
            "a name that is no header text");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  uint64_t length = 0;
  if (size < sizeof length) {
    return 0;
  }
  memcpy(&length, data, sizeof length);
  const std::string text(reinterpret_cast<const char*>(data) + sizeof length, size - sizeof length);
  askFor(text, static_cast<off_t>(length >> 1U));
  readDate(text);
  name(text);
  return 0;
}
