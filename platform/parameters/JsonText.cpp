#include "platform/parameters/JsonText.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <string_view>

#include "webapi/JsonHelper.h"

namespace QELO::Platform {
namespace {

constexpr int kMostDigits = 15;  // decimal digits that a double keeps

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

size_t skipDigits(std::string_view text, size_t at) {
  while (at < text.size() && isDigit(text[at])) {
    ++at;
  }
  return at;
}

/// Where the parts of a number stand: [sign] digits [. digits] [e digits].
struct NumberShape {
  size_t wholeEnd = 0;
  size_t mantissaEnd = 0;
  bool valid = false;
};

/// Reads the text by JSON's grammar of numbers.
NumberShape readShape(std::string_view text) {
  NumberShape shape;
  const size_t first = !text.empty() && text[0] == '-' ? 1 : 0;
  size_t at = skipDigits(text, first);
  if (at == first || (text[first] == '0' && at > first + 1)) {
    return shape;
  }
  shape.wholeEnd = at;
  if (at < text.size() && text[at] == '.') {
    const size_t fraction = at + 1;
    at = skipDigits(text, fraction);
    if (at == fraction) {
      return shape;
    }
  }
  shape.mantissaEnd = at;
  if (at < text.size() && (text[at] == 'e' || text[at] == 'E')) {
    ++at;
    at += at < text.size() && (text[at] == '+' || text[at] == '-') ? 1 : 0;
    const size_t exponent = at;
    at = skipDigits(text, exponent);
    if (at == exponent) {
      return shape;
    }
  }
  shape.valid = at == text.size();
  return shape;
}

int significantDigits(std::string_view mantissa) {
  int count = 0;
  for (const char c : mantissa) {
    count += isDigit(c) && (count > 0 || c != '0') ? 1 : 0;
  }
  return count;
}

template <typename T>
bool convert(std::string_view text, T& number) {
  const auto result = std::from_chars(text.data(), text.data() + text.size(), number);
  return result.ec == std::errc() && result.ptr == text.data() + text.size();
}

bool parseInteger(std::string_view text, Json::Value& value) {
  int64_t whole = 0;
  uint64_t large = 0;
  if (convert(text, whole)) {
    value = static_cast<Json::Int64>(whole);
    return text != "-0";
  }
  if (text[0] != '-' && convert(text, large)) {
    value = static_cast<Json::UInt64>(large);
    return true;
  }
  return false;
}

bool parseNumber(std::string_view text, Json::Value& value) {
  const NumberShape shape = readShape(text);
  if (!shape.valid) {
    return false;
  }
  Json::Value parsed;
  if (shape.wholeEnd == text.size()) {
    if (!parseInteger(text, parsed)) {
      return false;
    }
  } else {
    const int digits = significantDigits(text.substr(0, shape.mantissaEnd));
    double real = 0;
    if (digits > kMostDigits || !convert(text, real) || (real == 0 && digits > 0) ||
        std::fpclassify(real) == FP_SUBNORMAL) {
      return false;
    }
    parsed = real;
  }
  value.swap(parsed);
  return true;
}

/// Whether every number in the text of an array or object can be kept. The JSON reader itself
/// takes more for a number than JSON does, and rounds silently.
bool keepsItsNumbers(std::string_view text) {
  bool inString = false;
  for (size_t i = 0; i < text.size(); ++i) {
    if (inString) {
      inString = text[i] != '"';
      i += text[i] == '\\' ? 1 : 0;
    } else if (text[i] == '"') {
      inString = true;
    } else if (isDigit(text[i]) || text[i] == '-') {
      const size_t end = std::min(text.find_first_not_of("0123456789+-.eE", i), text.size());
      Json::Value ignored;
      if (!parseNumber(text.substr(i, end - i), ignored)) {
        return false;
      }
      i = end - 1;
    }
  }
  return true;
}

}  // namespace

bool parseJsonText(const std::string& text, Json::Value& value) {
  switch (text.empty() ? '\0' : text[0]) {
    case '{':
    case '[':
      return keepsItsNumbers(text) && JsonHelper::fromString(text, value);
    case '"':
    case 't':
    case 'f':
    case 'n':
      return JsonHelper::fromString(text, value);
    default:
      return parseNumber(text, value);
  }
}

}  // namespace QELO::Platform
