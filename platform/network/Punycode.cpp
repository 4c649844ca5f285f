#include "platform/network/Punycode.h"

#include <cstdint>

namespace QELO::Platform {
namespace {

// The parameters of Punycode; RFC 3492, section 5.
constexpr uint64_t kBase = 36;
constexpr uint64_t kTMin = 1;
constexpr uint64_t kTMax = 26;
constexpr uint64_t kSkew = 38;
constexpr uint64_t kDamp = 700;
constexpr uint64_t kInitialBias = 72;
constexpr uint64_t kInitialN = 128;

constexpr uint64_t kMaxCodePoint = 0x10FFFF;
constexpr uint64_t kLimit = uint64_t{1} << 32U;  ///< deltas beyond it are no character's

int digitOf(char c) {
  const char lower = static_cast<char>(c | 0x20);
  return lower >= 'a' && lower <= 'z' ? lower - 'a' : c >= '0' && c <= '9' ? c - '0' + 26 : -1;
}

uint64_t adapt(uint64_t delta, uint64_t length, bool first) {
  delta = first ? delta / kDamp : delta / 2;
  delta += delta / length;
  uint64_t k = 0;
  for (; delta > (kBase - kTMin) * kTMax / 2; k += kBase) {
    delta /= kBase - kTMin;
  }
  return k + (kBase - kTMin + 1) * delta / (delta + kSkew);
}

/// Takes one number of variable length off the text. @return false when it is malformed
bool takeDelta(std::string_view& text, uint64_t bias, uint64_t& delta) {
  uint64_t weight = 1;
  delta = 0;
  for (uint64_t k = kBase; !text.empty(); k += kBase) {
    const int digit = digitOf(text.front());
    text.remove_prefix(1);
    if (digit < 0) {
      return false;
    }
    delta += static_cast<uint64_t>(digit) * weight;
    const uint64_t threshold = k <= bias + kTMin ? kTMin : k >= bias + kTMax ? kTMax : k - bias;
    if (static_cast<uint64_t>(digit) < threshold) {
      return delta < kLimit;
    }
    weight *= kBase - threshold;
    if (delta >= kLimit || weight >= kLimit) {
      return false;
    }
  }
  return false;
}

bool isCharacter(uint64_t code) {
  return code <= kMaxCodePoint && (code < 0xD800 || code > 0xDFFF);
}

}  // namespace

bool isPunycode(std::string_view text) {
  const size_t delimiter = text.rfind('-');
  uint64_t length = delimiter == std::string_view::npos ? 0 : delimiter;
  text.remove_prefix(length > 0 ? length + 1 : 0);  // in front of it stand the ASCII characters
  if (text.empty()) {
    return false;
  }
  uint64_t code = kInitialN;
  uint64_t bias = kInitialBias;
  uint64_t place = 0;
  for (bool first = true; !text.empty(); first = false) {
    uint64_t delta = 0;
    if (!takeDelta(text, bias, delta)) {
      return false;
    }
    ++length;
    bias = adapt(delta, length, first);
    place += delta;
    code += place / length;
    place = place % length + 1;
    if (!isCharacter(code)) {
      return false;
    }
  }
  return true;
}

}  // namespace QELO::Platform
