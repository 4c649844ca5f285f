#pragma once

#include <json/json.h>

#include <string>
#include <string_view>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/method/Faults.h"
#include "webapi/method/Fields.h"

/// Reads JSON values into what a struct declares. Nothing throws but for want of memory.
namespace QELO::method {

template <typename>
inline constexpr bool kNever = false;

inline size_t SizeOf(const std::string& text) {
  size_t characters = 0;
  for (const char byte : text) {
    characters += (static_cast<unsigned char>(byte) & 0xC0U) != 0x80 ? 1 : 0;
  }
  return characters;
}
inline size_t SizeOf(const UploadedFile& file) {
  return file.size;
}
template <typename T>
size_t SizeOf(const std::vector<T>& list) {
  return list.size();
}

template <Integer T>
bool ReadValue(const Json::Value& value, const Path& path, T& result, Faults& faults) {
  if (value.type() == Json::intValue && std::in_range<T>(value.asLargestInt())) {
    result = static_cast<T>(value.asLargestInt());
    return true;
  }
  if (value.type() == Json::uintValue && std::in_range<T>(value.asLargestUInt())) {
    result = static_cast<T>(value.asLargestUInt());
    return true;
  }
  faults.Add(path, "type", "wants an integer of ", static_cast<int>(sizeof(T) * 8),
             std::is_signed_v<T> ? " bits" : " bits, 0 or more");
  return false;
}

inline bool ReadValue(const Json::Value& value, const Path& path, bool& result, Faults& faults) {
  if (value.type() != Json::booleanValue) {
    faults.Add(path, "type", "wants true or false");
    return false;
  }
  result = value.asBool();
  return true;
}

template <std::floating_point T>
bool ReadValue(const Json::Value& value, const Path& path, T& result, Faults& faults) {
  if (!value.isNumeric()) {
    faults.Add(path, "type", "wants a number");
    return false;
  }
  result = static_cast<T>(value.asDouble());
  return true;
}

/// A text that looks like a number, true or false has been read as one, unless the description
/// declares the parameter a string: it becomes a text again.
inline bool ReadValue(const Json::Value& value, const Path& path, std::string& result,
                      Faults& faults) {
  if (value.isNull() || value.isArray() || value.isObject()) {
    faults.Add(path, "type", "wants a text, in quotes when it looks like JSON");
    return false;
  }
  result = JsonHelper::asString(value);
  return true;
}

inline bool ReadValue(const Json::Value& value, const Path&, Json::Value& result, Faults&) {
  result = value;
  return true;
}

template <Described T>
bool ReadValue(const Json::Value& value, const Path& path, T& result, Faults& faults);

template <typename T>
bool ReadValue(const Json::Value& value, const Path& path, std::vector<T>& result, Faults& faults) {
  if (!value.isArray()) {
    faults.Add(path, "type", "wants a list");
    return false;
  }
  const unsigned before = faults.Count();
  result.clear();
  result.reserve(value.size());
  for (Json::ArrayIndex i = 0; i < value.size(); ++i) {
    T element{};
    ReadValue(value[i], Path{&path, nullptr, i}, element, faults);
    result.push_back(std::move(element));
  }
  return faults.Count() == before;
}

template <typename T>
bool ReadValue(const Json::Value&, const Path&, T&, Faults&) {
  static_assert(kNever<T>,
                "a parameter is a number, bool, std::string, Json::Value, UploadedFile, "
                "a struct with Fields(), or a std::vector or std::optional of one");
  return false;
}

template <Number V>
Json::Value NumberOf(V value) {
  if constexpr (std::floating_point<V>) {
    return static_cast<double>(value);
  } else if constexpr (std::is_signed_v<V>) {
    return static_cast<Json::LargestInt>(value);
  } else {
    return static_cast<Json::LargestUInt>(value);
  }
}

template <typename V>
void CheckSize(const V& value, const Bounds<V>& bounds, const Path& path, Faults& faults) {
  constexpr bool kText = !kIsList<V>;
  const char* what = !kText ? " values" : std::same_as<V, std::string> ? " characters" : " bytes";
  if (const size_t size = SizeOf(value); size < bounds.low) {
    faults.Add(path, kText ? "minLength" : "minItems", "wants at least ", bounds.low, what);
  } else if (size > bounds.high) {
    faults.Add(path, kText ? "maxLength" : "maxItems", "wants at most ", bounds.high, what);
  }
}

inline void CheckWord(const std::string& value, const char* const* words, const Path& path,
                      Faults& faults) {
  std::string all;
  for (size_t i = 0; i < kMostWords && words[i] != nullptr; ++i) {
    if (value == words[i]) {
      return;
    }
    all += (i == 0 ? "" : ", ") + std::string(words[i]);
  }
  faults.Add(path, "enum", "wants one of: " + all);
}

inline void CheckLine(const std::string& value, const Path& path, Faults& faults) {
  for (const char c : value) {
    if (const auto byte = static_cast<unsigned char>(c); byte < 0x20 || byte == 0x7F) {
      faults.Add(path, "pattern", "wants one line, without control characters");
      return;
    }
  }
}

/// What the field asks of a value of the right type.
template <typename S, typename T>
void CheckValue(const Field<S, T>& field, const typename Field<S, T>::Value& value,
                const Path& path, Faults& faults) {
  using V = typename Field<S, T>::Value;
  if constexpr (Number<V>) {
    // So written that what is no number keeps to no bounds.
    if (field.bounds.hasRange && !(value >= field.bounds.low)) {
      faults.Add(path, "minimum", "wants at least ", NumberOf(field.bounds.low));
    } else if (field.bounds.hasRange && !(value <= field.bounds.high)) {
      faults.Add(path, "maximum", "wants at most ", NumberOf(field.bounds.high));
    }
  } else if constexpr (requires { SizeOf(value); }) {
    if (field.bounds.hasRange) {
      CheckSize(value, field.bounds, path, faults);
    }
  }
  if constexpr (std::same_as<V, std::string>) {
    if (field.words[0] != nullptr) {
      CheckWord(value, field.words, path, faults);
    }
    if (field.isLine) {
      CheckLine(value, path, faults);
    }
  }
  if (field.check != nullptr && !field.check(value)) {
    faults.Add(path, "format", "wants ", field.wanted);
  }
}

inline UploadedFile FileOf(const Json::Value& file) {
  return {JsonHelper::asString(JsonHelper::member(file, "name")),
          JsonHelper::asString(JsonHelper::member(file, "path")),
          JsonHelper::asUInt64(JsonHelper::member(file, "size"))};
}

/// The files that came as the field: the first, or all for a list.
template <typename S, typename T>
void ReadFiles(const Field<S, T>& field, const Json::Value& files, const Path& above, S& result,
               Faults& faults) {
  bool isThere = false;
  for (const Json::Value& file : files) {
    if (!JsonHelper::isText(JsonHelper::member(file, "field"), field.name)) {
      continue;
    }
    if constexpr (kIsList<T>) {
      (result.*field.member).push_back(FileOf(file));
    } else if (!isThere) {
      result.*field.member = FileOf(file);
    }
    isThere = true;
  }
  const Path path{&above, field.name};
  if (!isThere && field.isRequired) {
    faults.Add(path, "required", "wants a file");
  }
  if constexpr (kIsOptional<T>) {
    if (isThere) {
      CheckValue(field, *(result.*field.member), path, faults);
    }
  } else if (isThere) {
    CheckValue(field, result.*field.member, path, faults);
  }
}

/// One member of a struct out of an object's member.
template <typename S, typename T>
void ReadMember(const Field<S, T>& field, const Json::Value& object, const Path& above, S& result,
                Faults& faults) {
  const Json::Value* sent = JsonHelper::find(object, field.name);
  const Path path{&above, field.name};
  if (sent == nullptr) {
    if (field.isRequired) {
      faults.Add(path, "required", "is missing");
    }
    return;
  }
  if constexpr (kIsOptional<T>) {
    if (sent->isNull()) {
      (result.*field.member).reset();
      return;
    }
    typename T::value_type value{};
    if (ReadValue(*sent, path, value, faults)) {
      CheckValue(field, value, path, faults);
      result.*field.member = std::move(value);
    }
  } else if (ReadValue(*sent, path, result.*field.member, faults)) {
    CheckValue(field, result.*field.member, path, faults);
  }
}

/// @param files  as APIUpload::GetFiles() gives them; null within other structs, which have none
template <Described T>
void ReadFields(const Json::Value& object, const Json::Value& files, const Path& path, T& result,
                Faults& faults) {
  const auto read = [&]<typename M>(const Field<T, M>& field) {
    if constexpr (kIsFile<M>) {
      ReadFiles(field, files, path, result, faults);
    } else {
      ReadMember(field, object, path, result, faults);
    }
  };
  std::apply([&](const auto&... field) { (read(field), ...); }, T::Fields());
}

template <Described T>
bool ReadValue(const Json::Value& value, const Path& path, T& result, Faults& faults) {
  if (!value.isObject()) {
    faults.Add(path, "type", "wants an object");
    return false;
  }
  const unsigned before = faults.Count();
  ReadFields(value, Json::Value(), path, result, faults);
  return faults.Count() == before;
}

}  // namespace QELO::method
