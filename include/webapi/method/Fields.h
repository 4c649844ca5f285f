#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <tuple>
#include <type_traits>
#include <vector>

namespace QELO {

/// A file that came with the call, as a member of a struct of parameters: the upload's field of
/// that name. Its temporary file is removed when the method has ended, unless the method has
/// renamed it; see APIUpload.
struct UploadedFile {
  std::string name;             ///< at the client's, without folders
  std::string path;             ///< of the temporary file
  unsigned long long size = 0;  ///< in bytes
};

namespace method {

template <typename>
inline constexpr bool kIsOptional = false;
template <typename T>
inline constexpr bool kIsOptional<std::optional<T>> = true;
template <typename>
inline constexpr bool kIsList = false;
template <typename T>
inline constexpr bool kIsList<std::vector<T>> = true;

/// Whether a member is filled from what was uploaded, not from the parameters.
template <typename T>
inline constexpr bool kIsFile =
    std::same_as<T, UploadedFile> || std::same_as<T, std::optional<UploadedFile>> ||
    std::same_as<T, std::vector<UploadedFile>>;

template <typename T>
struct Inner {
  using Type = T;
};
template <typename T>
struct Inner<std::optional<T>> {
  using Type = T;
};

template <typename T>
concept Integer = std::integral<T> && !std::same_as<T, bool> && !std::same_as<T, char> &&
                  !std::same_as<T, wchar_t> && !std::same_as<T, char8_t> &&
                  !std::same_as<T, char16_t> && !std::same_as<T, char32_t>;
template <typename T>
concept Number = Integer<T> || std::floating_point<T>;

/// A struct that says what members it has on the wire.
template <typename T>
concept Described = std::is_class_v<T> && requires {
  T::Fields();
};

constexpr size_t kMostWords = 16;  ///< of OneOf()

/// What a value has to keep to, beside its type.
template <typename V>
struct Bounds {
  bool hasRange = false;
  V low = V();
  V high = V();
};
template <typename V>
requires(!Number<V>) struct Bounds<V> {
  bool hasRange = false;  ///< of its size: characters of a text, values of a list, bytes of a file
  size_t low = 0;
  size_t high = SIZE_MAX;
};

/// One member of a struct: its name on the wire, and what its value has to keep to.
/// @tparam S  the struct  @tparam T  the member's type
template <typename S, typename T>
struct Field {
  using Member = T;
  using Value = typename Inner<T>::Type;

  const char* name;
  T S::*member;
  bool isRequired;
  Bounds<Value> bounds = {};
  const char* words[kMostWords] = {};
  bool (*check)(const Value&) = nullptr;
  const char* wanted = "";
  bool isLine = false;

  /// From `low` to `high`, both included.
  constexpr Field Between(Value low, Value high) const requires Number<Value> {
    Field field = *this;
    field.bounds = {true, low, high};
    return field;
  }
  /// So many characters (code points) at least and at most; bytes of a file.
  constexpr Field Length(size_t low, size_t high)
      const requires std::same_as<Value, std::string> || std::same_as<Value, UploadedFile> {
    return Sized(low, high);
  }
  /// As Length(), and without control characters: no ends of lines, no tabs.
  constexpr Field Line(size_t low, size_t high) const requires std::same_as<Value, std::string> {
    Field field = Sized(low, high);
    field.isLine = true;
    return field;
  }
  /// So many values at least and at most.
  constexpr Field Count(size_t low, size_t high) const requires kIsList<Value> {
    return Sized(low, high);
  }
  /// One of these words.
  template <std::same_as<const char*>... Words>
  constexpr Field OneOf(const char* first,
                        Words... more) const requires std::same_as<Value, std::string> {
    static_assert(sizeof...(more) < kMostWords, "OneOf() takes 16 words at most");
    Field field = *this;
    size_t count = 0;
    ((field.words[count++] = first), ..., (field.words[count++] = more));
    return field;
  }
  /// What a function says yes to, as those of APIValidator.
  /// @param what  what is wanted, for the error: "a mail address"
  constexpr Field Check(bool (*function)(const Value&), const char* what) const {
    Field field = *this;
    field.check = function;
    field.wanted = what;
    return field;
  }

 private:
  constexpr Field Sized(size_t low, size_t high) const {
    Field field = *this;
    field.bounds = {true, low, high};
    return field;
  }
};

}  // namespace method

/// A member that has to be sent, and not as null.
template <typename S, typename T>
constexpr method::Field<S, T> Required(const char* name, T S::*member) {
  static_assert(!method::kIsOptional<T>,
                "a required member is no std::optional: use Optional(), or another type");
  return {name, member, true};
}

/// A member that keeps what the struct initialises it with when it is not sent.
template <typename S, typename T>
constexpr method::Field<S, T> Optional(const char* name, T S::*member) {
  return {name, member, false};
}

/// The members of a struct, in the order in which they are read and written.
///
///     struct Find {
///       std::string name;
///       int limit = 50;
///       static constexpr auto Fields() {
///         return QELO::Fields(QELO::Required("name", &Find::name).Length(1, 100),
///                             QELO::Optional("limit", &Find::limit).Between(1, 500));
///       }
///     };
template <typename S, typename... Ts>
constexpr auto Fields(method::Field<S, Ts>... fields) {
  return std::tuple(fields...);
}

}  // namespace QELO
