#include "programs/webapi/diff/CompareSchema.h"

#include <algorithm>
#include <set>
#include <string>

#include "programs/webapi/Arguments.h"
#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

using JsonHelper::find;
using JsonHelper::hasMember;
using JsonHelper::member;

using Names = std::set<std::string>;

constexpr const char* kLowerBounds[] = {"minimum", "exclusiveMinimum", "minLength", "minItems",
                                        "minProperties"};
constexpr const char* kUpperBounds[] = {"maximum", "exclusiveMaximum", "maxLength", "maxItems",
                                        "maxProperties"};
/// What can only be the same or another.
constexpr const char* kWholes[] = {"pattern",
                                   "format",
                                   "multipleOf",
                                   "const",
                                   "patternProperties",
                                   "not",
                                   "propertyNames",
                                   "contains",
                                   "dependencies",
                                   "allOf",
                                   "anyOf",
                                   "oneOf",
                                   "if",
                                   "then",
                                   "else",
                                   "additionalItems",
                                   "$ref"};

Names namesOf(const Json::Value& list) {
  Names names;
  for (Json::ArrayIndex i = 0; list.isArray() && i < list.size(); ++i) {
    names.insert(JsonHelper::asString(list[i]));
  }
  return names;
}

/// The types that a schema lets through.
Names typesOf(const Json::Value& schema) {
  const Json::Value& type = member(schema, "type");
  Names types = type.isArray() ? namesOf(type) : Names{JsonHelper::asString(type)};
  if (!hasMember(schema, "type")) {
    types = {"string", "number", "boolean", "array", "object", "null"};
  }
  if (types.contains("number")) {
    types.insert("integer");
  }
  return types;
}

/// The first of the wanted names that is not there; "" when all are.
std::string missingIn(const Names& wanted, const Names& there) {
  const auto missing = std::find_if(wanted.begin(), wanted.end(),
                                    [&](const std::string& name) { return !there.contains(name); });
  return missing == wanted.end() ? "" : *missing;
}

std::string joined(const std::string& path, const std::string& name) {
  return path + "/" + name;
}

std::string called(const char* what, const std::string& path) {
  return path.empty() ? std::string(what) + "s" : std::string(what) + " " + Shown(path);
}

class ParameterComparison {
 public:
  ParameterComparison(const std::string& path, Changes& changes) : path_(path), changes_(changes) {}

  void Compare(const Json::Value& before, const Json::Value& after) {
    if (before == after || JsonHelper::asBool(after) || changes_.IsFull()) {
      return;  // what takes everything takes what it took
    }
    if (after.isBool()) {
      return Break(after, "nothing is taken any more");
    }
    const std::string type = missingIn(typesOf(before), typesOf(after));
    if (!type.empty()) {
      Break(placeOf(after, "type"), "no value of the type " + Shown(type) + " is taken any more");
    }
    Values(before, after);
    Bounds(before, after, kLowerBounds, [](double now, double then) { return now > then; });
    Bounds(before, after, kUpperBounds, [](double now, double then) { return now < then; });
    for (const char* key : kWholes) {
      if (hasMember(after, key) && member(after, key) != member(before, key)) {
        Break(member(after, key), std::string("\"") + key + "\" is another now");
      }
    }
    if (JsonHelper::asBool(member(after, "uniqueItems")) &&
        !JsonHelper::asBool(member(before, "uniqueItems"))) {
      Break(member(after, "uniqueItems"), "no value may stand there twice any more");
    }
    Items(before, after);
    Members(before, after);
    Defaults(before, after);
  }

 private:
  static const Json::Value& placeOf(const Json::Value& schema, const char* key) {
    const Json::Value* found = find(schema, key);
    return found != nullptr ? *found : schema;
  }

  void Break(const Json::Value& at, const std::string& text) {
    changes_.Add(Changes::kBreaks, Changes::kNewer, at, called("parameter", path_) + ": " + text);
  }

  void Values(const Json::Value& before, const Json::Value& after) {
    const Json::Value& values = member(after, "enum");
    if (!values.isArray()) {
      return;
    }
    const Json::Value& former = member(before, "enum");
    if (!former.isArray()) {
      return Break(values, "certain values alone are taken now");
    }
    for (const Json::Value& value : former) {
      if (std::find(values.begin(), values.end(), value) == values.end()) {
        return Break(values, Shown(JsonHelper::toString(value)) + " is not taken any more");
      }
    }
  }

  template <typename Tightened>
  void Bounds(const Json::Value& before, const Json::Value& after, const char* const (&keys)[5],
              Tightened isTightened) {
    for (const char* key : keys) {
      const Json::Value& now = member(after, key);
      const Json::Value& then = member(before, key);
      if (now.isNumeric() && (!then.isNumeric() || isTightened(now.asDouble(), then.asDouble()))) {
        Break(now, std::string("\"") + key + "\" is " + JsonHelper::toString(now) +
                       (then.isNumeric() ? ", and was " + JsonHelper::toString(then) : " now"));
      }
    }
  }

  void Items(const Json::Value& before, const Json::Value& after) {
    if (!hasMember(after, "items")) {
      return;
    }
    const Json::Value& now = member(after, "items");
    const Json::Value& then = member(before, "items");
    if (!now.isArray() && !then.isArray()) {
      CompareParameters(hasMember(before, "items") ? then : Json::Value(true), now,
                        joined(path_, "*"), changes_);
    } else if (now != then) {
      Break(now, "\"items\" are others now");
    }
  }

  void Members(const Json::Value& before, const Json::Value& after) {
    const Names former = namesOf(member(before, "required"));
    for (const std::string& name : namesOf(member(after, "required"))) {
      if (!former.contains(name)) {
        changes_.Add(Changes::kBreaks, Changes::kNewer, member(after, "required"),
                     "parameter " + Shown(joined(path_, name)) + " is required now");
      }
    }
    const Json::Value& others = member(after, "additionalProperties");
    const Json::Value& formerOthers = member(before, "additionalProperties");
    if (hasMember(after, "additionalProperties") && others != formerOthers &&
        !JsonHelper::asBool(others)) {
      Break(others, "others than the named ones are not taken as before");
    }
    Properties(before, after);
    const Json::Value& definitions = member(after, "definitions");
    for (auto it = definitions.begin(); definitions.isObject() && it != definitions.end(); ++it) {
      const Json::Value* then = find(member(before, "definitions"), it.name());
      if (then != nullptr) {
        CompareParameters(*then, *it, joined(path_ + "/definitions", it.name()), changes_);
      }
    }
  }

  void Properties(const Json::Value& before, const Json::Value& after) {
    const Json::Value& then = member(before, "properties");
    const Json::Value& now = member(after, "properties");
    for (auto it = then.begin(); then.isObject() && it != then.end(); ++it) {
      const std::string name = joined(path_, it.name());
      const Json::Value* same = find(now, it.name());
      if (same != nullptr) {
        CompareParameters(*it, *same, name, changes_);
      } else {
        changes_.AddAtName(Changes::kBreaks, Changes::kOld, *it,
                           "parameter " + Shown(name) + " is gone");
      }
    }
    const Names required = namesOf(member(after, "required"));
    for (auto it = now.begin(); now.isObject() && it != now.end(); ++it) {
      if (!hasMember(then, it.name()) && !required.contains(it.name())) {
        changes_.AddAtName(Changes::kNew, Changes::kNewer, *it,
                           "parameter " + Shown(joined(path_, it.name())));
      }
    }
  }

  void Defaults(const Json::Value& before, const Json::Value& after) {
    if (hasMember(before, "default") && member(before, "default") != member(after, "default")) {
      changes_.Add(Changes::kChanges, Changes::kNewer, placeOf(after, "default"),
                   called("parameter", path_) + ": the default was " +
                       Shown(JsonHelper::toString(member(before, "default"))));
    }
  }

  const std::string& path_;
  Changes& changes_;
};

}  // namespace

void CompareParameters(const Json::Value& before, const Json::Value& after, const std::string& path,
                       Changes& changes) {
  ParameterComparison(path, changes).Compare(before, after);
}

void CompareResults(const Json::Value& before, const Json::Value& after, const std::string& path,
                    Changes& changes) {
  if (before == after || !before.isObject() || changes.IsFull()) {
    return;
  }
  const auto breaks = [&](const Json::Value& at, const std::string& text) {
    changes.Add(Changes::kBreaks, Changes::kNewer, at, called("result", path) + ": " + text);
  };
  const std::string type = missingIn(typesOf(after), typesOf(before));
  if (!type.empty()) {
    breaks(after, "it may be of the type " + Shown(type) + " now");
  }
  const Json::Value& values = member(before, "enum");
  const Json::Value& newer = member(after, "enum");
  if (values.isArray() && std::any_of(newer.begin(), newer.end(), [&](const Json::Value& value) {
        return std::find(values.begin(), values.end(), value) == values.end();
      })) {
    breaks(newer, "it may have values that it did not have");
  }
  const Names required = namesOf(member(after, "required"));
  for (const std::string& name : namesOf(member(before, "required"))) {
    if (!required.contains(name)) {
      breaks(after, Shown(name) + " may be missing now");
    }
  }
  const Json::Value& then = member(before, "properties");
  for (auto it = then.begin(); then.isObject() && it != then.end(); ++it) {
    const Json::Value* now = find(member(after, "properties"), it.name());
    if (now != nullptr) {
      CompareResults(*it, *now, joined(path, it.name()), changes);
    } else {
      changes.AddAtName(Changes::kBreaks, Changes::kOld, *it,
                        "result " + Shown(joined(path, it.name())) + " is gone");
    }
  }
  CompareResults(member(before, "items"), member(after, "items"), joined(path, "*"), changes);
}

}  // namespace QELO::AuthorProgram
