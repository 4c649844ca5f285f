#include "webapi/json/Number.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <string>
#include <string_view>

#include "webapi/base/Text.h"

namespace QELO::JsonHelper {
namespace {

bool takeCharacter(const char*& at, const char* end, char c) {
  const bool found = at != end && *at == c;
  at += found ? 1 : 0;
  return found;
}

/// Takes one digit at least.
bool takeDigits(const char*& at, const char* end) {
  const char* start = at;
  while (at != end && IsDigit(*at)) {
    ++at;
  }
  return at != start;
}

/// @param whole  receives whether there is neither a fraction nor an exponent
bool takeNumber(const char*& at, const char* end, bool& whole) {
  takeCharacter(at, end, '-');
  if (!takeCharacter(at, end, '0') && !takeDigits(at, end)) {
    return false;
  }
  whole = true;
  if (takeCharacter(at, end, '.')) {
    whole = false;
    if (!takeDigits(at, end)) {
      return false;
    }
  }
  if (takeCharacter(at, end, 'e') || takeCharacter(at, end, 'E')) {
    whole = false;
    static_cast<void>(takeCharacter(at, end, '+') || takeCharacter(at, end, '-'));
    return takeDigits(at, end);
  }
  return true;
}

constexpr size_t kMostDigits = 767;  // that a double has when it is written out whole

/// What a number's text says: 0.digits times ten to the power of `exponent`, without zeros around
/// the digits. The sign is left out, since no conversion loses it.
struct Decimal {
  std::string digits;
  int64_t exponent = 0;
  bool isEndless = false;  ///< it has more digits than any double

  explicit Decimal(std::string_view text) {
    bool inFraction = false;
    for (size_t i = 0; i < text.size(); ++i) {
      const char c = text[i];
      if (c == 'e' || c == 'E') {
        AddExponent(text.substr(i + 1));
        break;
      }
      inFraction = inFraction || c == '.';
      if (IsDigit(c)) {
        AddDigit(c, inFraction);
      }
    }
    digits.resize(digits.find_last_not_of('0') + 1);
  }

  void AddDigit(char digit, bool inFraction) {
    if (digits.empty() && digit == '0') {
      exponent -= inFraction ? 1 : 0;
      return;
    }
    exponent += inFraction ? 0 : 1;
    if (digits.size() < kMostDigits) {
      digits += digit;
    } else {
      isEndless = isEndless || digit != '0';
    }
  }

  void AddExponent(std::string_view text) {
    constexpr int64_t kBeyond = std::numeric_limits<int32_t>::max();
    text.remove_prefix(text.starts_with('+') ? 1 : 0);
    int64_t power = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), power);
    exponent += result.ec == std::errc() ? power : kBeyond;
  }

  bool operator==(const Decimal& other) const {
    return digits == other.digits && (digits.empty() || exponent == other.exponent) &&
           isEndless == other.isEndless;
  }
};

/// Whether the text's digits are the real's: those of its shortest form, or all that it has.
bool keepsDigits(std::string_view text, double real) {
  char form[kMostDigits + 16];
  const Decimal said(text);
  const auto shortest = std::to_chars(form, form + sizeof form, real);
  if (said == Decimal({form, static_cast<size_t>(shortest.ptr - form)})) {
    return true;
  }
  if (said.digits.size() <= std::numeric_limits<double>::max_digits10) {
    return false;
  }
  const auto exact = std::to_chars(form, form + sizeof form, real, std::chars_format::scientific,
                                   static_cast<int>(kMostDigits) - 1);
  return exact.ec == std::errc() && said == Decimal({form, static_cast<size_t>(exact.ptr - form)});
}

bool readInteger(std::string_view text, bool keepDigits, Json::Value& value) {
  const char* end = text.data() + text.size();
  int64_t number = 0;
  uint64_t large = 0;
  if (std::from_chars(text.data(), end, number).ec == std::errc() &&
      number <= std::numeric_limits<int32_t>::max()) {
    value = Json::Value(static_cast<Json::Int64>(number));
    return !keepDigits || number != 0 || text.front() != '-';
  }
  if (text.front() != '-' && std::from_chars(text.data(), end, large).ec == std::errc()) {
    value = Json::Value(static_cast<Json::UInt64>(large));
    return true;
  }
  return false;
}

bool readReal(std::string_view text, bool keepDigits, Json::Value& value) {
  double number = 0;
  if (std::from_chars(text.data(), text.data() + text.size(), number).ec != std::errc()) {
    // Too small is as good as zero, too large is no number.
    number = std::strtod(std::string(text).c_str(), nullptr);
  }
  value = Json::Value(number);
  return std::isfinite(number) && (!keepDigits || keepsDigits(text, number));
}

}  // namespace

bool readNumber(const char*& at, const char* end, bool keepDigits, Json::Value& value) {
  const char* start = at;
  bool whole = true;
  if (!takeNumber(at, end, whole)) {
    return false;
  }
  const std::string_view number(start, static_cast<size_t>(at - start));
  if (whole && readInteger(number, keepDigits, value)) {
    return true;
  }
  return !(whole && keepDigits) && readReal(number, keepDigits, value);
}

}  // namespace QELO::JsonHelper
