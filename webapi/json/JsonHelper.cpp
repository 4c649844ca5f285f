#include "webapi/JsonHelper.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <charconv>
#include <cmath>
#include <cstdlib>
#include <exception>
#include <limits>
#include <utility>

#include "webapi/base/ReplaceFile.h"
#include "webapi/json/Reader.h"

namespace QELO::JsonHelper {
namespace {

bool parse(const std::string& text, bool comments, Json::Value& value) {
  try {
    Json::Value parsed;
    const bool good = readJsonText(text, comments, kMaxDepth, parsed);
    if (good) {
      value.swap(parsed);
    }
    return good;
  } catch (const std::exception&) {
    return false;
  }
}

bool readAll(const std::string& path, std::string& text) {
  // Not blocking: the name may be a pipe, which has no content to wait for.
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (fd < 0) {
    return false;
  }
  struct stat info {};
  bool good = fstat(fd, &info) == 0 && S_ISREG(info.st_mode);
  text.clear();
  while (good) {
    char buffer[4096];
    const ssize_t count = TEMP_FAILURE_RETRY(read(fd, buffer, sizeof buffer));
    if (count <= 0) {
      good = count == 0;
      break;
    }
    text.append(buffer, static_cast<size_t>(count));
  }
  close(fd);
  return good;
}

/// The number that the whole text is, or nothing.
template <typename T>
bool parseNumber(const std::string& text, T& number) {
  const char* end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, number);
  return !text.empty() && result.ec == std::errc() && result.ptr == end;
}

template <typename T>
T integerForm(const Json::Value& value, T fallback) {
  switch (value.type()) {
    case Json::intValue:
      return std::in_range<T>(value.asLargestInt()) ? static_cast<T>(value.asLargestInt())
                                                    : fallback;
    case Json::uintValue:
      return std::in_range<T>(value.asLargestUInt()) ? static_cast<T>(value.asLargestUInt())
                                                     : fallback;
    case Json::realValue: {
      const double real = std::trunc(value.asDouble());
      // 2^(digits) is exact as a double, the largest T itself may not be.
      const double limit = std::ldexp(1.0, std::numeric_limits<T>::digits);
      const double lowest = std::numeric_limits<T>::is_signed ? -limit : 0.0;
      return real >= lowest && real < limit ? static_cast<T>(real) : fallback;
    }
    case Json::booleanValue:
      return value.asBool() ? 1 : 0;
    case Json::stringValue: {
      T number = 0;
      return parseNumber(value.asString(), number) ? number : fallback;
    }
    default:
      return fallback;
  }
}

}  // namespace

bool fromString(const std::string& text, Json::Value& value) {
  return parse(text, false, value);
}

bool fromFile(const std::string& path, Json::Value& value) {
  std::string text;
  return readAll(path, text) && parse(text, true, value);
}

bool toFile(const std::string& path, const Json::Value& value) {
  return replaceText(path, toString(value), false);
}

const Json::Value* find(const Json::Value& value, std::string_view key) {
  return value.isObject() ? value.find(key.data(), key.data() + key.size()) : nullptr;
}

const Json::Value& member(const Json::Value& value, std::string_view key) {
  const Json::Value* found = find(value, key);
  return found != nullptr ? *found : Json::Value::nullSingleton();
}

bool hasMember(const Json::Value& value, std::string_view key) {
  return find(value, key) != nullptr;
}

std::string asString(const Json::Value& value, const std::string& fallback) {
  const char* start = nullptr;
  const char* end = nullptr;
  if (value.getString(&start, &end)) {
    return std::string(start, end);
  }
  if (value.type() == Json::realValue) {
    return toString(value);  // the library's own form has digits that no one wrote
  }
  return value.isConvertibleTo(Json::stringValue) ? value.asString() : fallback;
}

int asInt(const Json::Value& value, int fallback) {
  return integerForm<int>(value, fallback);
}

int64_t asInt64(const Json::Value& value, int64_t fallback) {
  return integerForm<int64_t>(value, fallback);
}

uint64_t asUInt64(const Json::Value& value, uint64_t fallback) {
  return integerForm<uint64_t>(value, fallback);
}

bool asBool(const Json::Value& value, bool fallback) {
  return value.isBool() || value.isNumeric() ? value.asBool() : fallback;
}

}  // namespace QELO::JsonHelper
