#include "platform/schema/module/Reading.h"

#include <string>

#include "platform/schema/module/SchemaCheck.h"
#include "platform/schema/module/Values.h"
#include "webapi/JsonHelper.h"
#include "webapi/json/Reader.h"
#include "webapi/json/SchemaReference.h"

namespace QELO::Platform {
namespace {

using JsonHelper::find;
using JsonHelper::member;

constexpr double kSmallest = -9223372036854775808.0;
constexpr double kTooLarge = 9223372036854775808.0;

/// What a text is to a parameter line: the JSON value that it is as a whole, else itself.
Json::Value asSent(const std::string& text) {
  Json::Value read;
  const JsonHelper::Reading how{.keepDigits = true};
  const bool isJson = JsonHelper::readJsonText(text, how, read) == JsonHelper::ReadResult::kRead;
  return isJson ? read : Json::Value(text);
}

}  // namespace

/// The types that a schema declares, kNoType when it leaves them open.
unsigned Reading::Declared(const Json::Value& schema, int depth) {
  const Json::Value* meant = FindReferred(root_, schema);
  if (meant == nullptr || !meant->isObject() || depth > SchemaCheck::kDeepest) {
    return kNoType;
  }
  if (const Json::Value* type = find(*meant, "type")) {
    unsigned types = typeBit(textOf(*type));
    for (Json::ArrayIndex i = 0; type->isArray() && i < type->size(); ++i) {
      types |= typeBit(textOf((*type)[i]));
    }
    return types;
  }
  if (const Json::Value* only = find(*meant, "const")) {
    return typesOf(*only);
  }
  unsigned types = kNoType;
  for (const Json::Value& choice : member(*meant, "enum")) {
    types |= typesOf(choice);
  }
  for (const Json::Value& each : member(*meant, "allOf")) {
    types = types != kNoType ? types : Declared(each, depth + 1);
  }
  for (const char* key : {"anyOf", "oneOf"}) {
    unsigned either = kNoType;
    for (const Json::Value& each : member(*meant, key)) {
      const unsigned own = Declared(each, depth + 1);
      if (own == kNoType) {
        return types;
      }
      either |= own;
    }
    types = types != kNoType ? types : either;
  }
  return types;
}

void Reading::TakeText(const Json::Value& schema, const Json::Value& sent, Json::Value& value) {
  const unsigned types = Declared(schema, 0);
  if (!sent.isString() || types == kNoType) {
    return;
  }
  const std::string text(textOf(sent));
  const bool isText = (types & kText) != 0;
  if (isText && types != kText && (types & typesOf(value)) != 0) {
    return;
  }
  const Json::Value read = asSent(text);
  if (compare(read, value) != 0 || read.type() != value.type()) {
    return;  // another text of that name
  }
  Json::Value number;
  if (isText) {
    value = sent;
  } else if ((types & kNumber) != 0 && value.isString() && !text.empty() && text[0] != '"' &&
             JsonHelper::readJsonText(text, {}, number) == JsonHelper::ReadResult::kRead &&
             isNumber(number)) {
    value = number;  // its digits are more than a real has
  }
}

void Reading::Read(const Json::Value& schema, const Json::Value& sent, Json::Value& value) {
  const Json::Value* meant = FindReferred(root_, schema);
  if (visitsLeft_ == 0 || meant == nullptr || !meant->isObject()) {
    return;
  }
  --visitsLeft_;
  if (value.isObject()) {
    ReadMembers(*meant, sent, value);
  } else if (value.isArray()) {
    ReadItems(*meant, value);
  } else if (value.type() == Json::realValue && isWhole(value) && value.asDouble() >= kSmallest &&
             value.asDouble() < kTooLarge &&
             (Declared(*meant, 0) & (kInteger | kNumber)) == kInteger) {
    value = Json::Value(static_cast<Json::Int64>(value.asDouble()));
  }
  for (const Json::Value& each : member(*meant, "allOf")) {
    Read(each, sent, value);
  }
}

void Reading::ReadMembers(const Json::Value& schema, const Json::Value& sent, Json::Value& value) {
  const Json::Value& properties = member(schema, "properties");
  for (auto it = properties.begin(); it != properties.end(); ++it) {
    const std::string name = it.name();
    if (!JsonHelper::hasMember(value, name)) {
      const Json::Value* meant = FindReferred(root_, *it);
      const Json::Value* filled = meant != nullptr ? find(*meant, "default") : nullptr;
      if (filled == nullptr) {
        continue;
      }
      value[name] = *filled;
    } else {
      TakeText(*it, member(sent, name), value[name]);
    }
    Read(*it, Json::Value::nullSingleton(), value[name]);
  }
}

void Reading::ReadItems(const Json::Value& schema, Json::Value& value) {
  const Json::Value* items = find(schema, "items");
  for (Json::ArrayIndex i = 0; items != nullptr && i < value.size(); ++i) {
    if (!items->isArray()) {
      Read(*items, Json::Value::nullSingleton(), value[i]);
    } else if (i < items->size()) {
      Read((*items)[i], Json::Value::nullSingleton(), value[i]);
    }
  }
}

}  // namespace QELO::Platform
