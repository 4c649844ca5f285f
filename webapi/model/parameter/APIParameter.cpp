#include "webapi/APIParameter.h"

#include <limits>
#include <type_traits>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/model/parameter/APIParameterPrivate.h"

namespace QELO {
namespace {

/// Takes an integer that fits T. What counts is the kind that is stored: the JSON library's own
/// tests mean 32 bits and let reals through.
template <typename T>
bool parseIntegral(const Json::Value& value, T& target) {
  if (value.type() == Json::intValue && std::in_range<T>(value.asLargestInt())) {
    target = static_cast<T>(value.asLargestInt());
    return true;
  }
  // An int is taken from the signed kind alone, which is what JSON text gives for its range.
  if constexpr (!std::is_same_v<T, int>) {
    if (value.type() == Json::uintValue && std::in_range<T>(value.asLargestUInt())) {
      target = static_cast<T>(value.asLargestUInt());
      return true;
    }
  }
  return false;
}

template <typename T>
bool parse(const Json::Value& value, Json::ValueType, T& target) {
  return parseIntegral(value, target);
}

template <>
bool parse(const Json::Value& value, Json::ValueType, bool& target) {
  if (!value.isBool()) {
    return false;
  }
  target = value.asBool();
  return true;
}

template <>
bool parse(const Json::Value& value, Json::ValueType, double& target) {
  if (!value.isNumeric()) {
    return false;
  }
  target = value.asDouble();
  return true;
}

template <>
bool parse(const Json::Value& value, Json::ValueType, std::string& target) {
  if (value.type() != Json::stringValue) {
    return false;
  }
  target = JsonHelper::asString(value);
  return true;
}

template <>
bool parse(const Json::Value& value, Json::ValueType type, Json::Value& target) {
  if (value.type() != type) {
    return false;
  }
  target = value;
  return true;
}

/// Reads one member of a container as a parameter.
template <typename T>
APIParameter<T> readMember(const Json::Value& container, const std::string& key,
                           PARAM_NECESSITY necessity, Json::ValueType type,
                           bool (*validator)(const T&)) {
  APIParameter<T> parameter;
  if (JsonHelper::hasMember(container, key)) {
    parameter.CheckValueTypeAndGet(JsonHelper::member(container, key), type, validator);
  } else if (!container.isObject() || necessity == PARAM_REQUIRED) {
    parameter.MarkInvalid();
  }
  return parameter;
}

}  // namespace

template <typename T>
APIParameter<T>::APIParameter() : private_(std::make_unique<APIParameterPrivate<T>>()) {}

template <typename T>
APIParameter<T>::APIParameter(const APIParameter& other)
    : private_(std::make_unique<APIParameterPrivate<T>>(*other.private_)) {}

template <typename T>
APIParameter<T>& APIParameter<T>::operator=(const APIParameter& other) {
  *private_ = *other.private_;
  return *this;
}

template <typename T>
APIParameter<T>::~APIParameter() = default;

template <typename T>
const T& APIParameter<T>::Get() const {
  return private_->value;
}

template <typename T>
T APIParameter<T>::Get(const T& def) const {
  return !IsSet() || IsInvalid() ? def : private_->value;
}

template <typename T>
bool APIParameter<T>::IsSet() const {
  return private_->isSet;
}

template <typename T>
bool APIParameter<T>::IsReset() const {
  return private_->isReset;
}

template <typename T>
bool APIParameter<T>::IsInvalid() const {
  return private_->isInvalid;
}

template <typename T>
bool APIParameter<T>::IsDefault() const {
  return private_->isDefault;
}

template <typename T>
void APIParameter<T>::MarkSet() {
  private_->isSet = true;
}

template <typename T>
void APIParameter<T>::MarkReset() {
  private_->isReset = true;
}

template <typename T>
void APIParameter<T>::MarkInvalid() {
  private_->isInvalid = true;
}

template <typename T>
void APIParameter<T>::MarkDefault() {
  private_->isDefault = true;
}

template <typename T>
bool APIParameter<T>::SetDefault(const T& value) {
  if (IsInvalid()) {
    return false;
  }
  if (!IsSet()) {
    private_->value = value;
    MarkSet();
    MarkDefault();
  }
  return true;
}

template <typename T>
bool APIParameter<T>::operator==(const T& value) const {
  return private_->value == value;
}

template <typename T>
bool APIParameter<T>::operator!=(const T& value) const {
  return !(*this == value);
}

template <typename T>
bool APIParameter<T>::operator==(const APIParameter& other) const {
  return *this == other.Get();
}

template <typename T>
bool APIParameter<T>::operator!=(const APIParameter& other) const {
  return !(*this == other);
}

template <typename T>
bool APIParameter<T>::CheckValueTypeAndGet(const Json::Value& value, Json::ValueType type,
                                           Validator validator) {
  MarkSet();
  if (value.type() == Json::nullValue) {
    MarkReset();
    return true;
  }
  if (!ParseValue(value, type) || (validator != nullptr && !validator(private_->value))) {
    MarkInvalid();
    return false;
  }
  return true;
}

template <typename T>
bool APIParameter<T>::ParseValue(const Json::Value& value, Json::ValueType type) {
  return parse<T>(value, type, private_->value);
}

template <typename T>
APIParameter<T> APIParameterFactoryBasicImpl<T>::FromJson(const Json::Value& container,
                                                          const std::string& key,
                                                          PARAM_NECESSITY necessity,
                                                          bool (*validator)(const T&)) {
  return readMember<T>(container, key, necessity, Json::nullValue, validator);
}

APIParameter<Json::Value> APIParameterFactory::ArrayFromJson(
    const Json::Value& container, const std::string& key, PARAM_NECESSITY necessity,
    bool (*validator)(const Json::Value&)) {
  return readMember<Json::Value>(container, key, necessity, Json::arrayValue, validator);
}

APIParameter<Json::Value> APIParameterFactory::ObjectFromJson(
    const Json::Value& container, const std::string& key, PARAM_NECESSITY necessity,
    bool (*validator)(const Json::Value&)) {
  return readMember<Json::Value>(container, key, necessity, Json::objectValue, validator);
}

template class APIParameter<int>;
template class APIParameter<long long>;
template class APIParameter<unsigned int>;
template class APIParameter<unsigned long long>;
template class APIParameter<bool>;
template class APIParameter<double>;
template class APIParameter<std::string>;
template class APIParameter<Json::Value>;
template class APIParameterFactoryBasicImpl<int>;
template class APIParameterFactoryBasicImpl<long long>;
template class APIParameterFactoryBasicImpl<unsigned int>;
template class APIParameterFactoryBasicImpl<unsigned long long>;
template class APIParameterFactoryBasicImpl<bool>;
template class APIParameterFactoryBasicImpl<double>;
template class APIParameterFactoryBasicImpl<std::string>;

}  // namespace QELO
