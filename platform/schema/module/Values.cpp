#include "platform/schema/module/Values.h"

#include <cmath>
#include <cstdint>

#include "platform/schema/module/Pattern.h"

namespace QELO::Platform {
namespace {

constexpr double kTwoTo64 = 18446744073709551616.0;
constexpr double kRounding = 1e-9;  ///< of a quotient of two reals

int sign(bool isLess, bool isGreater) {
  return isLess ? -1 : isGreater ? 1 : 0;
}

bool isInteger(const Json::Value& value) {
  return value.type() == Json::intValue || value.type() == Json::uintValue;
}

bool isNegative(const Json::Value& integer) {
  return integer.type() == Json::intValue && integer.asLargestInt() < 0;
}

/// How far from 0.
uint64_t magnitude(const Json::Value& integer) {
  if (!isNegative(integer)) {
    return integer.asLargestUInt();
  }
  return uint64_t{0} - static_cast<uint64_t>(integer.asLargestInt());
}

int compareIntegers(const Json::Value& left, const Json::Value& right) {
  if (isNegative(left) != isNegative(right)) {
    return isNegative(left) ? -1 : 1;
  }
  const uint64_t one = magnitude(left);
  const uint64_t other = magnitude(right);
  return isNegative(left) ? sign(one > other, one < other) : sign(one<other, one> other);
}

int compareToReal(const Json::Value& integer, double real) {
  const bool below = isNegative(integer);
  if (below != (real < 0)) {
    return below ? -1 : 1;
  }
  const double size = std::fabs(real);
  if (size >= kTwoTo64) {
    return below ? 1 : -1;
  }
  const double floor = std::floor(size);
  const uint64_t one = magnitude(integer);
  const auto other = static_cast<uint64_t>(floor);
  const int bySize = one == other ? sign(size > floor, false) : sign(one<other, one> other);
  return below ? -bySize : bySize;
}

int compareNumbers(const Json::Value& left, const Json::Value& right) {
  if (isInteger(left)) {
    return isInteger(right) ? compareIntegers(left, right) : compareToReal(left, right.asDouble());
  }
  if (isInteger(right)) {
    return -compareToReal(right, left.asDouble());
  }
  return sign(left.asDouble() < right.asDouble(), left.asDouble() > right.asDouble());
}

int compareLists(const Json::Value& left, const Json::Value& right) {
  if (left.size() != right.size()) {
    return left.size() < right.size() ? -1 : 1;
  }
  for (Json::ArrayIndex i = 0; i < left.size(); ++i) {
    const int order = compare(left[i], right[i]);
    if (order != 0) {
      return order;
    }
  }
  return 0;
}

int compareObjects(const Json::Value& left, const Json::Value& right) {
  if (left.size() != right.size()) {
    return left.size() < right.size() ? -1 : 1;
  }
  for (auto one = left.begin(), other = right.begin(); one != left.end(); ++one, ++other) {
    const int byName = one.name().compare(other.name());
    const int order = byName != 0 ? byName : compare(*one, *other);
    if (order != 0) {
      return order;
    }
  }
  return 0;
}

}  // namespace

unsigned typeBit(std::string_view name) {
  struct Named {
    char name[8];
    unsigned bit;
  };
  static constexpr Named kTypes[] = {
      {"null", kNull},   {"boolean", kBoolean}, {"integer", kInteger}, {"number", kNumber},
      {"string", kText}, {"array", kList},      {"object", kObject}};
  for (const Named& type : kTypes) {
    if (name == type.name) {
      return type.bit;
    }
  }
  return kNoType;
}

unsigned typesOf(const Json::Value& value) {
  switch (value.type()) {
    case Json::nullValue:
      return kNull;
    case Json::booleanValue:
      return kBoolean;
    case Json::stringValue:
      return kText;
    case Json::arrayValue:
      return kList;
    case Json::objectValue:
      return kObject;
    default:
      return isWhole(value) ? kNumber | kInteger : kNumber;
  }
}

bool isNumber(const Json::Value& value) {
  return isInteger(value) || value.type() == Json::realValue;
}

bool isWhole(const Json::Value& number) {
  return isInteger(number) || std::floor(number.asDouble()) == number.asDouble();
}

std::string_view textOf(const Json::Value& text) {
  const char* begin = nullptr;
  const char* end = nullptr;
  return text.getString(&begin, &end) ? std::string_view(begin, static_cast<size_t>(end - begin))
                                      : std::string_view();
}

size_t pointsIn(std::string_view text) {
  size_t count = 0;
  for (; !text.empty(); ++count) {
    takePoint(text);
  }
  return count;
}

int compare(const Json::Value& left, const Json::Value& right) {
  if (isNumber(left) && isNumber(right)) {
    return compareNumbers(left, right);
  }
  if (left.type() != right.type()) {
    return left.type() < right.type() ? -1 : 1;
  }
  switch (left.type()) {
    case Json::booleanValue:
      return sign(!left.asBool() && right.asBool(), left.asBool() && !right.asBool());
    case Json::stringValue:
      return textOf(left).compare(textOf(right));
    case Json::arrayValue:
      return compareLists(left, right);
    case Json::objectValue:
      return compareObjects(left, right);
    default:
      return 0;
  }
}

bool isMultiple(const Json::Value& number, const Json::Value& unit) {
  if (isInteger(number) && isInteger(unit)) {
    return magnitude(number) % magnitude(unit) == 0;
  }
  const double times = number.asDouble() / unit.asDouble();
  if (!std::isfinite(times)) {
    return false;
  }
  return std::fabs(times - std::round(times)) <= kRounding * std::fmax(1, std::fabs(times));
}

}  // namespace QELO::Platform
