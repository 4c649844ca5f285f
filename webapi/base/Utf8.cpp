#include "webapi/base/Utf8.h"

#include <algorithm>

namespace QELO {
namespace {

constexpr char kReplacement[] = "\xEF\xBF\xBD";

unsigned char byteAt(const std::string& text, size_t position) {
  return position < text.size() ? static_cast<unsigned char>(text[position]) : 0;
}

bool isBetween(unsigned char byte, unsigned char low, unsigned char high) {
  return byte >= low && byte <= high;
}

/// Bytes of the sequence that starts here, 0 when none does. Neither overlong forms nor
/// surrogates are sequences.
size_t sequenceLength(const std::string& text, size_t position) {
  const unsigned char lead = byteAt(text, position);
  if (lead < 0x80) {
    return 1;
  }
  size_t length = isBetween(lead, 0xC2, 0xDF)   ? 2
                  : isBetween(lead, 0xE0, 0xEF) ? 3
                  : isBetween(lead, 0xF0, 0xF4) ? 4
                                                : 0;
  const unsigned char lowest = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
  const unsigned char highest = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
  for (size_t i = 1; i < length; ++i) {
    const unsigned char byte = byteAt(text, position + i);
    if (!(i == 1 ? isBetween(byte, lowest, highest) : isBetween(byte, 0x80, 0xBF))) {
      return 0;
    }
  }
  return length;
}

}  // namespace

std::string RepairUtf8(const std::string& text) {
  if (std::all_of(text.begin(), text.end(), [](char c) { return (c & 0x80) == 0; })) {
    return text;
  }
  std::string repaired;
  repaired.reserve(text.size());
  size_t position = 0;
  while (position < text.size()) {
    const size_t length = sequenceLength(text, position);
    if (length == 0) {
      repaired += kReplacement;
      ++position;
    } else {
      repaired.append(text, position, length);
      position += length;
    }
  }
  return repaired;
}

}  // namespace QELO
