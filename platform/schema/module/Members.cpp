// Lists and objects.

#include <algorithm>
#include <vector>

#include "platform/schema/module/Validator.h"
#include "platform/schema/module/Values.h"
#include "webapi/JsonHelper.h"

namespace QELO::Platform {
namespace {

using JsonHelper::find;

bool hasTwins(const Json::Value& list) {
  std::vector<const Json::Value*> items;
  for (const Json::Value& item : list) {
    items.push_back(&item);
  }
  std::sort(items.begin(), items.end(), [](const Json::Value* left, const Json::Value* right) {
    return compare(*left, *right) < 0;
  });
  return std::adjacent_find(items.begin(), items.end(),
                            [](const Json::Value* left, const Json::Value* right) {
                              return compare(*left, *right) == 0;
                            }) != items.end();
}

}  // namespace

bool Validator::CheckList(const Json::Value& schema, const Json::Value& value, const Place& place) {
  bool fits = !IsTooMany(schema, "maxItems", "minItems", value.size(), " items", place);
  if (JsonHelper::asBool(JsonHelper::member(schema, "uniqueItems")) && hasTwins(value)) {
    fits = Fail(place, "uniqueItems", "must not have an item twice");
  }
  if (const Json::Value* wanted = find(schema, "contains")) {
    const bool isIn = std::any_of(value.begin(), value.end(), [&](const Json::Value& item) {
      return Probe(*wanted, item, place);
    });
    fits =
        (isIn || Fail(place, "contains", "lacks an item of the kind that must be there")) && fits;
  }
  return CheckItems(schema, value, place) && fits;
}

bool Validator::CheckItems(const Json::Value& schema, const Json::Value& value,
                           const Place& place) {
  const Json::Value* items = find(schema, "items");
  if (items == nullptr) {
    return true;
  }
  const Json::Value* further = find(schema, "additionalItems");
  bool fits = true;
  for (Json::ArrayIndex i = 0; i < value.size() && !isExhausted_; ++i) {
    const Json::Value* each = items;
    const char* rule = "items";
    if (items->isArray() && i < items->size()) {
      each = &(*items)[i];
    } else if (items->isArray()) {
      each = further;
      rule = "additionalItems";
    }
    fits = (each == nullptr || Check(*each, value[i], Place(place, size_t{i}), rule)) && fits;
  }
  return fits && !isExhausted_;
}

bool Validator::CheckObject(const Json::Value& schema, const Json::Value& value,
                            const Place& place) {
  bool fits = !IsTooMany(schema, "maxProperties", "minProperties", value.size(), " members", place);
  fits = CheckRequired(schema, value, place) && fits;
  fits = CheckDependencies(schema, value, place) && fits;
  return CheckMembers(schema, value, place) && fits;
}

bool Validator::CheckRequired(const Json::Value& schema, const Json::Value& value,
                              const Place& place) {
  const Json::Value* names = find(schema, "required");
  bool fits = true;
  for (Json::ArrayIndex i = 0; names != nullptr && i < names->size(); ++i) {
    const std::string_view name = textOf((*names)[i]);
    if (!JsonHelper::hasMember(value, name)) {
      fits = Fail(Place(place, name), "required", "is missing");
    }
  }
  return fits;
}

bool Validator::CheckMembers(const Json::Value& schema, const Json::Value& value,
                             const Place& place) {
  const Json::Value* names = find(schema, "propertyNames");
  if (names == nullptr && find(schema, "properties") == nullptr &&
      find(schema, "patternProperties") == nullptr &&
      find(schema, "additionalProperties") == nullptr) {
    return true;
  }
  bool fits = true;
  for (auto it = value.begin(); it != value.end() && !isExhausted_; ++it) {
    const std::string name = it.name();
    const Place member(place, name);
    if (names != nullptr && !Probe(*names, Json::Value(name), member)) {
      fits = Fail(member, "propertyNames", "must not be called so");
    }
    fits = CheckMember(schema, name, *it, member) && fits;
  }
  return fits && !isExhausted_;
}

bool Validator::CheckMember(const Json::Value& schema, const std::string& name,
                            const Json::Value& value, const Place& place) {
  bool fits = true;
  bool isDeclared = false;
  if (const Json::Value* own = find(JsonHelper::member(schema, "properties"), name)) {
    isDeclared = true;
    fits = Check(*own, value, place, "properties");
  }
  const Json::Value& patterns = JsonHelper::member(schema, "patternProperties");
  for (auto it = patterns.begin(); it != patterns.end(); ++it) {
    if (Matches(it.name(), name)) {
      isDeclared = true;
      fits = Check(*it, value, place, "patternProperties") && fits;
    }
  }
  const Json::Value* others = isDeclared ? nullptr : find(schema, "additionalProperties");
  return (others == nullptr || Check(*others, value, place, "additionalProperties")) && fits;
}

bool Validator::CheckDependencies(const Json::Value& schema, const Json::Value& value,
                                  const Place& place) {
  const Json::Value& dependencies = JsonHelper::member(schema, "dependencies");
  bool fits = true;
  for (auto it = dependencies.begin(); it != dependencies.end(); ++it) {
    if (!JsonHelper::hasMember(value, it.name())) {
      continue;
    }
    if (!it->isArray()) {
      fits = Check(*it, value, place, "dependencies") && fits;
      continue;
    }
    for (const Json::Value& name : *it) {
      if (!JsonHelper::hasMember(value, textOf(name))) {
        fits = Fail(Place(place, textOf(name)), "dependencies", "is missing beside others");
      }
    }
  }
  return fits;
}

}  // namespace QELO::Platform
