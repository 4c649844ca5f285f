#include "platform/parameters/JsonText.h"

#include "webapi/json/Reader.h"

namespace QELO::Platform {

JsonText readJsonText(std::string_view text, Json::Value& value, size_t& valuesLeft) {
  Json::Value read;
  size_t values = 0;
  const auto result =
      JsonHelper::readJsonText(text, {.keepDigits = true, .maxValues = valuesLeft}, read, &values);
  if (result != JsonHelper::ReadResult::kRead) {
    return result == JsonHelper::ReadResult::kTooMany ? JsonText::kTooMany : JsonText::kOther;
  }
  valuesLeft -= values;
  value.swap(read);
  return JsonText::kValue;
}

}  // namespace QELO::Platform
