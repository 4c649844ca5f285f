#include "platform/schema/module/SchemaCheck.h"

#include <algorithm>
#include <iterator>
#include <set>

#include "platform/schema/module/Pattern.h"
#include "platform/schema/module/Values.h"
#include "webapi/JsonHelper.h"
#include "webapi/json/SchemaReference.h"

namespace QELO::Platform {
namespace {

template <size_t N>
bool isOneOf(const std::string& name, const char* const (&names)[N]) {
  return std::find(std::begin(names), std::end(names), name) != std::end(names);
}

constexpr const char* kNumbers[] = {"maximum", "minimum", "exclusiveMaximum", "exclusiveMinimum"};
constexpr const char* kCounts[] = {"maxLength", "minLength",     "maxItems",
                                   "minItems",  "maxProperties", "minProperties"};
constexpr const char* kTexts[] = {"title", "description", "$comment", "format", "$id", "$schema"};
constexpr const char* kFlags[] = {"uniqueItems", "readOnly", "writeOnly"};
constexpr const char* kLists[] = {"allOf", "anyOf", "oneOf"};
constexpr const char* kSchemas[] = {
    "not",           "if",      "then", "else", "additionalItems", "additionalProperties",
    "propertyNames", "contains"};
constexpr const char* kMaps[] = {"properties", "patternProperties", "definitions"};

}  // namespace

void SchemaCheck::Schema(const Json::Value& schema, const Place& place, int depth) {
  if (schema.isBool()) {
    return;
  }
  if (!schema.isObject()) {
    faults_.Add(place, "type", "a schema is an object, true or false");
    return;
  }
  if (++count_ > kMostSchemas || depth > kDeepest) {
    faults_.AddPath("", "$ref", "too many schemas in one, or one that leads back to itself");
    return;
  }
  if (JsonHelper::hasMember(schema, "$ref")) {  // what stands beside it does not count
    Reference(schema, place, depth);
    return;
  }
  for (auto it = schema.begin(); it != schema.end(); ++it) {
    const std::string name = it.name();
    Keyword(name, *it, Place(place, name), depth);
  }
}

void SchemaCheck::Reference(const Json::Value& schema, const Place& place, int depth) {
  const Json::Value* found = FindReferred(root_, schema);
  if (found == nullptr) {
    faults_.Add(Place(place, "$ref"), "$ref",
                "leads nowhere within this schema, as \"#/definitions/name\" does, or in a circle");
    return;
  }
  Schema(*found, place, depth + 1);
}

void SchemaCheck::Keyword(const std::string& name, const Json::Value& value, const Place& place,
                          int depth) {
  if (!Plain(name, value, place)) {
    Nested(name, value, place, depth);
  }
}

bool SchemaCheck::Plain(const std::string& name, const Json::Value& value, const Place& place) {
  const char* wrong = nullptr;
  if (name == "type") {
    Type(value, place);
  } else if (name == "enum") {
    wrong = value.isArray() && !value.empty() && value.size() <= kMostChoices
                ? nullptr
                : "must be a list of 1 to 1000 values";
  } else if (name == "multipleOf") {
    wrong = isNumber(value) && compare(value, Json::Value(0)) > 0 ? nullptr
                                                                  : "must be a number above 0";
  } else if (isOneOf(name, kNumbers)) {
    wrong = isNumber(value) ? nullptr : "must be a number";
  } else if (isOneOf(name, kCounts)) {
    wrong = (typesOf(value) & kInteger) != 0 && compare(value, Json::Value(0)) >= 0
                ? nullptr
                : "must be an integer from 0 on";
  } else if (isOneOf(name, kTexts)) {
    wrong = value.isString() ? nullptr : "must be a text";
  } else if (isOneOf(name, kFlags)) {
    wrong = value.isBool() ? nullptr : "must be true or false";
  } else if (name == "pattern") {
    wrong = value.isString() ? nullptr : "must be a text";
    if (wrong == nullptr) {
      Expression(value.asString(), place, "pattern");
    }
  } else if (name == "required") {
    Names(value, place, "required");
  } else {
    return false;
  }
  if (wrong != nullptr) {
    faults_.Add(place, name.c_str(), wrong);
  }
  return true;
}

bool SchemaCheck::Nested(const std::string& name, const Json::Value& value, const Place& place,
                         int depth) {
  if (isOneOf(name, kLists)) {
    if (!value.isArray() || value.empty()) {
      faults_.Add(place, name.c_str(), "must be a list of schemas");
    } else {
      Schemas(value, place, depth);
    }
  } else if (isOneOf(name, kMaps)) {
    if (!value.isObject()) {
      faults_.Add(place, name.c_str(), "must be an object of schemas");
      return true;
    }
    Members(value, place, depth);
    for (auto it = value.begin(); name == "patternProperties" && it != value.end(); ++it) {
      const std::string expression = it.name();
      Expression(expression, Place(place, expression), "patternProperties");
    }
  } else if (name == "items" && value.isArray()) {
    Schemas(value, place, depth);
  } else if (name == "items" || isOneOf(name, kSchemas)) {
    Schema(value, place, depth + 1);
  } else if (name == "dependencies") {
    Dependencies(value, place, depth);
  } else {
    return false;
  }
  return true;
}

void SchemaCheck::Schemas(const Json::Value& list, const Place& place, int depth) {
  for (Json::ArrayIndex i = 0; i < list.size(); ++i) {
    Schema(list[i], Place(place, size_t{i}), depth + 1);
  }
}

void SchemaCheck::Members(const Json::Value& schemas, const Place& place, int depth) {
  for (auto it = schemas.begin(); it != schemas.end(); ++it) {
    const std::string name = it.name();
    Schema(*it, Place(place, name), depth + 1);
  }
}

void SchemaCheck::Dependencies(const Json::Value& value, const Place& place, int depth) {
  if (!value.isObject()) {
    faults_.Add(place, "dependencies", "must be an object of schemas or lists of names");
    return;
  }
  for (auto it = value.begin(); it != value.end(); ++it) {
    const std::string name = it.name();
    if (it->isArray()) {
      Names(*it, Place(place, name), "dependencies");
    } else {
      Schema(*it, Place(place, name), depth + 1);
    }
  }
}

void SchemaCheck::Type(const Json::Value& value, const Place& place) {
  const auto isType = [](const Json::Value& name) {
    return name.isString() && typeBit(textOf(name)) != kNoType;
  };
  const bool isGood = value.isArray()
                          ? !value.empty() && std::all_of(value.begin(), value.end(), isType)
                          : isType(value);
  if (!isGood) {
    faults_.Add(place, "type",
                "must be one of \"null\", \"boolean\", \"integer\", \"number\", \"string\", "
                "\"array\" and \"object\", or a list of them");
  }
}

void SchemaCheck::Names(const Json::Value& value, const Place& place, const char* rule) {
  const bool isGood =
      value.isArray() && std::all_of(value.begin(), value.end(),
                                     [](const Json::Value& name) { return name.isString(); });
  if (!isGood) {
    faults_.Add(place, rule, "must be a list of names");
  }
}

void SchemaCheck::Expression(const std::string& text, const Place& place, const char* rule) {
  Pattern pattern;
  std::string reason;
  if (!Pattern::Read(text, pattern, reason)) {
    faults_.Add(place, rule, reason);
  }
}

}  // namespace QELO::Platform
