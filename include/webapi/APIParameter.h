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
/// set: it was sent (null too), or a default was filled in. reset: it was sent as null, which asks
/// to take a setting away. invalid: required and missing, of the wrong type or range, refused by
/// the validator, or its container was no object. default: the value came from SetDefault.
///
/// A fresh parameter has none of the four, and none is ever taken back: a parameter is read once.
///
/// T is one of int, long long, unsigned int, unsigned long long, bool, double, std::string and
/// Json::Value.
template <typename T>
class APIParameter {
 public:
  /// Says whether a value of the right type will do. It must not throw.
  using Validator = bool (*)(const T&);

  /// No flag, and the value-initialised T: 0, false, "" or null.
  APIParameter();
  /// Copies the value and all flags, as the assignment does.
  APIParameter(const APIParameter& other);
  APIParameter& operator=(const APIParameter& other);
  ~APIParameter();

  /// The value, whatever the flags: the value-initialised T when it was not sent, sent as null or
  /// of the wrong type; what was sent when the validator refused it.
  const T& Get() const;
  /// `def` when not set or invalid, else the value: also for a parameter sent as null, whose
  /// value is the value-initialised T.
  T Get(const T& def) const;

  /// The four flags. A missing optional parameter has none, a missing required one is invalid and
  /// not set, one of the wrong type set and invalid.
  bool IsSet() const;
  bool IsReset() const;
  bool IsInvalid() const;
  bool IsDefault() const;
  /// Raise one flag each, for code that reads or judges a value by itself: MarkInvalid() after a
  /// check that no validator can make. The value and the other flags stay.
  void MarkSet();
  void MarkReset();
  void MarkInvalid();
  void MarkDefault();

  /// Fills in `value`, and is set and default from then on, when the parameter was not sent. One
  /// sent as null stays so. No validator is asked.
  /// @return false, and nothing changes, when invalid: `if (!p.SetDefault(10))` refuses what was
  ///         sent wrong.
  bool SetDefault(const T& value);

  /// Compare the value, whatever the flags: one that was not sent equals 0.
  bool operator==(const T& value) const;
  bool operator!=(const T& value) const;
  /// Compare the two values alone.
  bool operator==(const APIParameter& other) const;
  bool operator!=(const APIParameter& other) const;

  /// Takes a value that was sent, and is set from then on. Null is accepted as reset without asking
  /// the validator.
  /// @param type       for Json::Value the type wanted; not consulted for any other T
  /// @param validator  may be null
  /// @return false, and marked invalid, when type, range or validator refuse it. The value stays as
  ///         it was, but for one that the validator refused.
  bool CheckValueTypeAndGet(const Json::Value& value, Json::ValueType type, Validator validator);

  /// Takes the value when type and range fit; flags stay as they are. Nothing is converted: an
  /// integer type takes stored integers within its range, double any number, bool true and false.
  /// @param type  as for CheckValueTypeAndGet()
  /// @return false, and the value as it was, when they do not.
  bool ParseValue(const Json::Value& value, Json::ValueType type);

 private:
  std::unique_ptr<APIParameterPrivate<T>> private_;
};

/// Reads members of any JSON object as parameters of a basic type: all of APIParameter's but
/// Json::Value.
template <typename T>
class APIParameterFactoryBasicImpl {
 public:
  /// @param validator  may be null
  /// @return invalid when `container` is no object, whether or not the member is optional
  static APIParameter<T> FromJson(const Json::Value& container, const std::string& key,
                                  PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                  bool (*validator)(const T&) = nullptr);
};

/// The factories of all types, for what stands within an object or list: GetAndCheckObject() of the
/// request gives the object, FromJson<int>(object.Get(), "count") its member.
class WEBAPI_API APIParameterFactory {
 public:
  /// As APIParameterFactoryBasicImpl: T is one of its types.
  template <typename T>
  static APIParameter<T> FromJson(const Json::Value& container, const std::string& key,
                                  PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                  bool (*validator)(const T&) = nullptr) {
    return APIParameterFactoryBasicImpl<T>::FromJson(container, key, necessity, validator);
  }
  /// As FromJson(), for a member that is a list or an object.
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
