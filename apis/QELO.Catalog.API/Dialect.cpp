#include "Dialect.h"

#include <webapi/JsonHelper.h>

#include <algorithm>
#include <iterator>
#include <string>

namespace {

namespace JsonHelper = QELO::JsonHelper;

constexpr const char* kSchemas[] = {
    "not", "if", "then", "else", "additionalProperties", "propertyNames", "contains"};
constexpr const char* kLists[] = {"allOf", "anyOf", "oneOf"};
constexpr const char* kMaps[] = {"properties", "patternProperties"};

template <size_t N>
bool IsOneOf(const std::string& name, const char* const (&names)[N]) {
  return std::find(std::begin(names), std::end(names), name) != std::end(names);
}

Json::Value ModernList(const Json::Value& schemas) {
  Json::Value modern(Json::arrayValue);
  for (const Json::Value& schema : schemas) {
    modern.append(Modern(schema));
  }
  return modern;
}

Json::Value ModernMap(const Json::Value& schemas) {
  Json::Value modern(Json::objectValue);
  for (auto it = schemas.begin(); it != schemas.end(); ++it) {
    modern[it.name()] = Modern(*it);
  }
  return modern;
}

void AddDependencies(const Json::Value& dependencies, Json::Value& modern) {
  for (auto it = dependencies.begin(); it != dependencies.end(); ++it) {
    if (it->isArray()) {
      modern["dependentRequired"][it.name()] = *it;
    } else {
      modern["dependentSchemas"][it.name()] = Modern(*it);
    }
  }
}

/// A list of items has another name by now, and what follows them takes theirs.
void AddItems(const Json::Value& schema, Json::Value& modern) {
  const Json::Value& items = JsonHelper::member(schema, "items");
  if (!items.isArray()) {
    modern["items"] = Modern(items);
    return;
  }
  if (!items.empty()) {
    modern["prefixItems"] = ModernList(items);
  }
  if (JsonHelper::hasMember(schema, "additionalItems")) {
    modern["items"] = Modern(JsonHelper::member(schema, "additionalItems"));
  }
}

}  // namespace

Json::Value Modern(const Json::Value& schema) {
  if (!schema.isObject()) {
    return schema;
  }
  Json::Value modern(Json::objectValue);
  for (auto it = schema.begin(); it != schema.end(); ++it) {
    const std::string name = it.name();
    if (name == "$schema" || name == "$id" || name == "additionalItems" || name == "definitions") {
      continue;
    }
    if (name == "items") {
      AddItems(schema, modern);
    } else if (name == "dependencies") {
      AddDependencies(*it, modern);
    } else if (IsOneOf(name, kSchemas)) {
      modern[name] = Modern(*it);
    } else if (IsOneOf(name, kLists) && it->isArray()) {
      modern[name] = ModernList(*it);
    } else if (IsOneOf(name, kMaps) && it->isObject()) {
      modern[name] = ModernMap(*it);
    } else {
      modern[name] = *it;
    }
  }
  return modern;
}
