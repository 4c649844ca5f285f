#include "webapi/APIParameter.h"
#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"

namespace QELO {

template <typename T>
APIParameter<T> APIRequestPrivate::GetAndCheckParam(const std::string& name, bool required,
                                                    Json::ValueType type,
                                                    bool (*validator)(const T&)) const {
  APIParameter<T> parameter;
  if (const Json::Value* value = Find("param", name)) {
    parameter.CheckValueTypeAndGet(*value, type, validator);
  } else if (required) {
    parameter.MarkInvalid();
  }
  return parameter;
}

APIParameter<Json::Value> APIRequestPrivate::GetAndCheckUnitArrayParam(
    const std::string& name, bool required, bool (*validator)(const Json::Value&)) const {
  const Json::Value* found = Find("param", name);
  if (found == nullptr) {
    return GetAndCheckParam<Json::Value>(name, required, Json::arrayValue, validator);
  }
  Json::Value list = *found;
  if (!list.isArray()) {
    Json::Value wrapped(Json::arrayValue);
    wrapped.append(list);
    list.swap(wrapped);
  }
  APIParameter<Json::Value> parameter;
  parameter.CheckValueTypeAndGet(list, Json::arrayValue, validator);
  return parameter;
}

APIParameter<int> APIRequest::GetAndCheckInt(const std::string& name, PARAM_NECESSITY necessity,
                                             bool (*validator)(const int&)) const {
  return private_->GetAndCheckParam<int>(name, necessity == PARAM_REQUIRED, Json::intValue,
                                         validator);
}

APIParameter<bool> APIRequest::GetAndCheckBool(const std::string& name, PARAM_NECESSITY necessity,
                                               bool (*validator)(const bool&)) const {
  return private_->GetAndCheckParam<bool>(name, necessity == PARAM_REQUIRED, Json::booleanValue,
                                          validator);
}

APIParameter<double> APIRequest::GetAndCheckReal(const std::string& name, PARAM_NECESSITY necessity,
                                                 bool (*validator)(const double&)) const {
  return private_->GetAndCheckParam<double>(name, necessity == PARAM_REQUIRED, Json::realValue,
                                            validator);
}

APIParameter<std::string> APIRequest::GetAndCheckString(
    const std::string& name, PARAM_NECESSITY necessity,
    bool (*validator)(const std::string&)) const {
  return private_->GetAndCheckParam<std::string>(name, necessity == PARAM_REQUIRED,
                                                 Json::stringValue, validator);
}

APIParameter<Json::Value> APIRequest::GetAndCheckArray(
    const std::string& name, PARAM_NECESSITY necessity,
    bool (*validator)(const Json::Value&)) const {
  return private_->GetAndCheckParam<Json::Value>(name, necessity == PARAM_REQUIRED,
                                                 Json::arrayValue, validator);
}

APIParameter<Json::Value> APIRequest::GetAndCheckObject(
    const std::string& name, PARAM_NECESSITY necessity,
    bool (*validator)(const Json::Value&)) const {
  return private_->GetAndCheckParam<Json::Value>(name, necessity == PARAM_REQUIRED,
                                                 Json::objectValue, validator);
}

APIParameter<Json::Value> APIRequest::GetAndCheckUnitArray(
    const std::string& name, PARAM_NECESSITY necessity,
    bool (*validator)(const Json::Value&)) const {
  return private_->GetAndCheckUnitArrayParam(name, necessity == PARAM_REQUIRED, validator);
}

template <typename T>
APIParameter<T> APIRequest::GetAndCheckIntegral(const std::string& name, PARAM_NECESSITY necessity,
                                                bool (*validator)(const T&)) const {
  // The type is consulted for JSON values alone.
  return private_->GetAndCheckParam<T>(name, necessity == PARAM_REQUIRED, Json::objectValue,
                                       validator);
}

template APIParameter<long long> APIRequest::GetAndCheckIntegral<long long>(
    const std::string&, PARAM_NECESSITY, bool (*)(const long long&)) const;
template APIParameter<unsigned int> APIRequest::GetAndCheckIntegral<unsigned int>(
    const std::string&, PARAM_NECESSITY, bool (*)(const unsigned int&)) const;
template APIParameter<unsigned long long> APIRequest::GetAndCheckIntegral<unsigned long long>(
    const std::string&, PARAM_NECESSITY, bool (*)(const unsigned long long&)) const;

}  // namespace QELO
