#pragma once

#include <json/json.h>

#include <optional>
#include <utility>

#include "webapi/WebAPIError.h"

namespace QELO {

/// What a method fails with, thrown or returned: `throw QELO::Error{404}`. The answer is its code,
/// and its detail as "errors" unless that is null.
struct Error {
  int code = WEBAPI_ERR_NO_ANSWER;  ///< the API's own, from 400 on, or one of WebAPIError.h
  Json::Value detail = {};
};

/// What a method returns that has filled in the response by itself.
struct Answered {};

/// A value or an error, for methods that would rather return than throw one:
/// `QELO::Result<Person> find(const Find& wanted)`.
template <typename T>
class Result {
 public:
  Result(T value) : value_(std::move(value)) {}
  Result(Error error) : error_(std::move(error)) {}

  explicit operator bool() const { return value_.has_value(); }
  /// The value; only of a result that has one.
  const T& operator*() const { return *value_; }
  const T* operator->() const { return &*value_; }
  /// The error; only of a result without a value.
  const Error& Failure() const { return error_; }

 private:
  std::optional<T> value_;
  Error error_ = {};
};

/// Success without a value, or an error: `return {};` or `return QELO::Error{404};`.
template <>
class Result<void> {
 public:
  Result() = default;
  Result(Error error) : error_(std::move(error)) {}

  explicit operator bool() const { return !error_.has_value(); }
  const Error& Failure() const { return *error_; }

 private:
  std::optional<Error> error_;
};

}  // namespace QELO
