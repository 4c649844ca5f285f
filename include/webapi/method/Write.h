#pragma once

#include <json/json.h>

#include <cmath>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "webapi/method/Fields.h"

namespace QELO {

template <typename T>
Json::Value ToJson(const T& value);

namespace method {

template <typename T>
concept Text = std::convertible_to<const T&, std::string_view>;
template <typename T>
concept Listed = requires(const T& list) {
  list.begin() != list.end();
};

template <typename S>
Json::Value ObjectOf(const S& value) {
  Json::Value object(Json::objectValue);
  std::apply(
      [&](const auto&... field) { ((object[field.name] = ToJson(value.*field.member)), ...); },
      S::Fields());
  return object;
}

template <typename List>
Json::Value ListOf(const List& values) {
  Json::Value list(Json::arrayValue);
  for (const auto& value : values) {
    list.append(ToJson(value));
  }
  return list;
}

template <typename>
inline constexpr bool kCannotBeWritten = false;

}  // namespace method

/// The value as JSON: numbers, bool, texts, Json::Value, structs with Fields(), and lists and
/// std::optional of those. Null stands for what an optional has not, and for what is no number.
template <typename T>
Json::Value ToJson(const T& value) {
  if constexpr (std::same_as<T, Json::Value>) {
    return value;
  } else if constexpr (std::same_as<T, bool>) {
    return Json::Value(value);
  } else if constexpr (method::Integer<T>) {
    return std::is_signed_v<T> ? Json::Value(static_cast<Json::LargestInt>(value))
                               : Json::Value(static_cast<Json::LargestUInt>(value));
  } else if constexpr (std::floating_point<T>) {
    return std::isfinite(value) ? Json::Value(static_cast<double>(value)) : Json::Value();
  } else if constexpr (method::kIsOptional<T>) {
    return value ? ToJson(*value) : Json::Value();
  } else if constexpr (method::Described<T>) {
    return method::ObjectOf(value);
  } else if constexpr (method::Text<T>) {
    const std::string_view text(value);
    return Json::Value(text.data(), text.data() + text.size());
  } else if constexpr (method::Listed<T>) {
    return method::ListOf(value);
  } else {
    static_assert(method::kCannotBeWritten<T>,
                  "a result is a number, bool, text, Json::Value, a struct with Fields(), or a "
                  "list or std::optional of one");
  }
}

}  // namespace QELO
