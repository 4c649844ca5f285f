#include "webapi/JsonHelper.h"

#include <cmath>
#include <exception>
#include <limits>
#include <utility>

#include "webapi/base/Number.h"
#include "webapi/base/ReplaceFile.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/Utf8.h"
#include "webapi/json/Reader.h"

namespace QELO::JsonHelper {
namespace {

bool parse(const std::string& text, bool comments, Json::Value& value) {
  try {
    Json::Value parsed;
    const bool good = readJsonText(text, {.comments = comments}, parsed) == ReadResult::kRead;
    if (good) {
      value.swap(parsed);
    }
    return good;
  } catch (const std::exception&) {
    return false;
  }
}

bool readAll(const std::string& path, std::string& text) {
  UniqueFd file;
  struct stat info {};
  return OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0) == 0 &&
         ReadText(file.Get(), text.max_size(), text);
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
      const char* begin = nullptr;
      const char* end = nullptr;
      T number = fallback;
      value.getString(&begin, &end);
      ParseNumber(std::string_view(begin, static_cast<size_t>(end - begin)), number);
      return number;
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
  return ReplaceFile(path, toString(value));
}

const Json::Value* find(const Json::Value& value, std::string_view key) {
  return value.type() == Json::objectValue ? value.find(key.data(), key.data() + key.size())
                                           : nullptr;
}

const Json::Value& member(const Json::Value& value, std::string_view key) {
  const Json::Value* found = find(value, key);
  return found != nullptr ? *found : Json::Value::nullSingleton();
}

bool hasMember(const Json::Value& value, std::string_view key) {
  return find(value, key) != nullptr;
}

bool isText(const Json::Value& value, std::string_view text) {
  const char* start = nullptr;
  const char* end = nullptr;
  return value.getString(&start, &end) &&
         std::string_view(start, static_cast<size_t>(end - start)) == text;
}

std::string asString(const Json::Value& value, const std::string& fallback) {
  const char* start = nullptr;
  const char* end = nullptr;
  if (value.getString(&start, &end)) {
    return std::string(start, end);
  }
  if (value.type() == Json::nullValue) {
    return "";
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
  switch (value.type()) {
    case Json::booleanValue:
    case Json::intValue:
    case Json::uintValue:
    case Json::realValue:
      return value.asBool();
    default:
      return fallback;
  }
}

std::string repairUtf8(const std::string& text) {
  return RepairUtf8(text);
}

}  // namespace QELO::JsonHelper
