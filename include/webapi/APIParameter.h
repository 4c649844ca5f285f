#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/Export.h"

namespace QELO {

/// Whether a missing parameter is an error. Any value but 0 means optional.
enum PARAM_NECESSITY : int { PARAM_REQUIRED = 0, PARAM_OPTIONAL = 1 };

template <typename T>
class APIParameterPrivate;

/// One parameter read from JSON, with what became of it.
///
/// set: it was sent (be it null), or a default was filled in. reset: it was sent as null.
/// invalid: required and missing, of the wrong type or range, refused by the validator, or its
/// container was no object. default: the value came from SetDefault. A fresh parameter has none.
///
/// T is one of int, long long, unsigned int, unsigned long long, bool, double, std::string and
/// Json::Value.
template <typename T>
class APIParameter {
 public:
  using Validator = bool (*)(const T&);

  APIParameter();
  APIParameter(const APIParameter& other);
  APIParameter& operator=(const APIParameter& other);
  ~APIParameter();

  /// The value, whatever the flags; value-initialised until parsed.
  const T& Get() const;
  /// `def` when not set or invalid, else the value: also for a parameter sent as null, whose
  /// value is the value-initialised T.
  T Get(const T& def) const;

  bool IsSet() const;
  bool IsReset() const;
  bool IsInvalid() const;
  bool IsDefault() const;
  void MarkSet();
  void MarkReset();
  void MarkInvalid();
  void MarkDefault();

  /// Fills in `value` when the parameter was not sent.
  /// @return false, and nothing changes, when invalid.
  bool SetDefault(const T& value);

  bool operator==(const T& value) const;
  bool operator!=(const T& value) const;
  /// Compares the values alone, not the flags.
  bool operator==(const APIParameter& other) const;
  bool operator!=(const APIParameter& other) const;

  /// Takes a value that was sent. Null is accepted as reset without asking the validator.
  /// @param type       consulted for Json::Value only
  /// @param validator  may be null
  /// @return false, and marked invalid, when type, range or validator refuse it.
  bool CheckValueTypeAndGet(const Json::Value& value, Json::ValueType type, Validator validator);

  /// Takes the value when type and range fit; flags stay as they are.
  /// @return false, and the value as it was, when they do not.
  bool ParseValue(const Json::Value& value, Json::ValueType type);

 private:
  std::unique_ptr<APIParameterPrivate<T>> private_;
};

/// Reads members of any JSON object as parameters of a basic type.
template <typename T>
class APIParameterFactoryBasicImpl {
 public:
  /// Invalid when `container` is no object, be the member optional or not.
  static APIParameter<T> FromJson(const Json::Value& container, const std::string& key,
                                  PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                  bool (*validator)(const T&) = nullptr);
};

/// The factories of all types.
class WEBAPI_API APIParameterFactory {
 public:
  template <typename T>
  static APIParameter<T> FromJson(const Json::Value& container, const std::string& key,
                                  PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                  bool (*validator)(const T&) = nullptr) {
    return APIParameterFactoryBasicImpl<T>::FromJson(container, key, necessity, validator);
  }
  static APIParameter<Json::Value> ArrayFromJson(const Json::Value& container,
                                                 const std::string& key,
                                                 PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                                 bool (*validator)(const Json::Value&) = nullptr);
  static APIParameter<Json::Value> ObjectFromJson(const Json::Value& container,
                                                  const std::string& key,
                                                  PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                                  bool (*validator)(const Json::Value&) = nullptr);
};

extern template class WEBAPI_API APIParameter<int>;
extern template class WEBAPI_API APIParameter<long long>;
extern template class WEBAPI_API APIParameter<unsigned int>;
extern template class WEBAPI_API APIParameter<unsigned long long>;
extern template class WEBAPI_API APIParameter<bool>;
extern template class WEBAPI_API APIParameter<double>;
extern template class WEBAPI_API APIParameter<std::string>;
extern template class WEBAPI_API APIParameter<Json::Value>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<int>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<long long>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<unsigned int>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<unsigned long long>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<bool>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<double>;
extern template class WEBAPI_API APIParameterFactoryBasicImpl<std::string>;

}  // namespace QELO
