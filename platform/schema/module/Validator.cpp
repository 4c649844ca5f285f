#include "platform/schema/module/Validator.h"

#include "platform/schema/module/Format.h"
#include "platform/schema/module/Values.h"
#include "webapi/JsonHelper.h"
#include "webapi/json/SchemaReference.h"

namespace QELO::Platform {
namespace {

using JsonHelper::find;

constexpr size_t kLongestWish = 200;  ///< bytes of what a message says a value must be

/// A value of the schema's, for a message.
std::string shown(const Json::Value& value) {
  std::string text = JsonHelper::toString(value);
  if (text.size() > kLongestWish) {
    text.resize(kLongestWish);
    text = JsonHelper::repairUtf8(text) + "...";
  }
  return text;
}

unsigned namedTypes(const Json::Value& type) {
  unsigned types = typeBit(textOf(type));
  for (Json::ArrayIndex i = 0; type.isArray() && i < type.size(); ++i) {
    types |= typeBit(textOf(type[i]));
  }
  return types;
}

}  // namespace

bool Validator::Fail(const Place& place, const char* rule, const std::string& message) {
  if (faults_ != nullptr) {
    faults_->Add(place, rule, message);
  }
  return false;
}

bool Validator::Exhausted() {
  isExhausted_ = true;
  return Fail(Place(), "size", "this is too much to be checked");
}

bool Validator::Check(const Json::Value& schema, const Json::Value& value, const Place& place,
                      const char* rule) {
  if (isExhausted_ || visitsLeft_ == 0) {
    return Exhausted();
  }
  --visitsLeft_;
  const Json::Value* meant = FindReferred(root_, schema);
  if (meant == nullptr || !meant->isObject()) {
    return (meant != nullptr && meant->isBool() && meant->asBool()) ||
           Fail(place, rule, "must not be there");
  }
  if (meant->empty()) {
    return true;
  }
  bool fits = CheckType(*meant, value, place);
  fits = CheckChoice(*meant, value, place) && fits;
  if (isNumber(value)) {
    fits = CheckNumber(*meant, value, place) && fits;
  } else if (value.isString()) {
    fits = CheckText(*meant, value, place) && fits;
  } else if (value.isArray()) {
    fits = CheckList(*meant, value, place) && fits;
  } else if (value.isObject()) {
    fits = CheckObject(*meant, value, place) && fits;
  }
  fits = CheckTogether(*meant, value, place) && fits;
  return CheckCondition(*meant, value, place) && fits;
}

bool Validator::CheckType(const Json::Value& schema, const Json::Value& value, const Place& place) {
  const Json::Value* type = find(schema, "type");
  if (type == nullptr || (namedTypes(*type) & typesOf(value)) != 0) {
    return true;
  }
  return Fail(place, "type", "must be of the type " + shown(*type));
}

bool Validator::CheckChoice(const Json::Value& schema, const Json::Value& value,
                            const Place& place) {
  if (const Json::Value* only = find(schema, "const")) {
    if (compare(*only, value) != 0) {
      return Fail(place, "const", "must be " + shown(*only));
    }
  }
  const Json::Value* choices = find(schema, "enum");
  if (choices == nullptr) {
    return true;
  }
  for (const Json::Value& choice : *choices) {
    if (compare(choice, value) == 0) {
      return true;
    }
  }
  return Fail(place, "enum", "must be one of " + shown(*choices));
}

bool Validator::CheckNumber(const Json::Value& schema, const Json::Value& value,
                            const Place& place) {
  struct Bound {
    const char* rule;
    int wrong;       ///< how the value compares with the bound when it is beyond
    bool isReached;  ///< the bound itself is beyond too
    const char* words;
  };
  static constexpr Bound kBounds[] = {{"maximum", 1, false, "must be at most "},
                                      {"minimum", -1, false, "must be at least "},
                                      {"exclusiveMaximum", 1, true, "must be below "},
                                      {"exclusiveMinimum", -1, true, "must be above "}};
  bool fits = true;
  for (const Bound& bound : kBounds) {
    const Json::Value* limit = find(schema, bound.rule);
    if (limit == nullptr) {
      continue;
    }
    const int order = compare(value, *limit);
    if (order * bound.wrong > 0 || (bound.isReached && order == 0)) {
      fits = Fail(place, bound.rule, bound.words + shown(*limit));
    }
  }
  const Json::Value* unit = find(schema, "multipleOf");
  if (unit != nullptr && !isMultiple(value, *unit)) {
    fits = Fail(place, "multipleOf", "must be a multiple of " + shown(*unit));
  }
  return fits;
}

bool Validator::IsTooMany(const Json::Value& schema, const char* most, const char* least,
                          size_t count, const char* what, const Place& place) {
  const Json::Value number(static_cast<Json::UInt64>(count));
  const Json::Value* limit = find(schema, most);
  if (limit != nullptr && compare(number, *limit) > 0) {
    return !Fail(place, most, "must have at most " + shown(*limit) + what);
  }
  limit = find(schema, least);
  return limit != nullptr && compare(number, *limit) < 0 &&
         !Fail(place, least, "must have at least " + shown(*limit) + what);
}

bool Validator::Matches(const std::string& expression, std::string_view text) {
  const auto [at, isNew] = patterns_.try_emplace(expression);
  std::string reason;
  if (isNew && !Pattern::Read(expression, at->second, reason)) {
    return false;
  }
  const bool found = at->second.IsIn(text, workLeft_);
  return found || (workLeft_ == 0 && Exhausted());
}

bool Validator::CheckText(const Json::Value& schema, const Json::Value& value, const Place& place) {
  const std::string_view text = textOf(value);
  bool fits = true;
  if (find(schema, "maxLength") != nullptr || find(schema, "minLength") != nullptr) {
    fits = !IsTooMany(schema, "maxLength", "minLength", pointsIn(text), " characters", place);
  }
  const Json::Value* pattern = find(schema, "pattern");
  if (pattern != nullptr && !Matches(std::string(textOf(*pattern)), text)) {
    fits = Fail(place, "pattern", "must match " + shown(*pattern));
  }
  const Json::Value* format = find(schema, "format");
  if (format != nullptr && !isOfFormat(textOf(*format), text)) {
    fits = Fail(place, "format", "must be of the format " + shown(*format));
  }
  return fits;
}

bool Validator::Probe(const Json::Value& schema, const Json::Value& value, const Place& place) {
  Faults* const told = faults_;
  faults_ = nullptr;
  const bool fits = Check(schema, value, place, "not");
  faults_ = told;
  return fits;
}

size_t Validator::CountFitting(const Json::Value& schemas, const Json::Value& value,
                               const Place& place) {
  size_t count = 0;
  for (const Json::Value& schema : schemas) {
    count += Probe(schema, value, place) ? 1 : 0;
  }
  return count;
}

bool Validator::CheckTogether(const Json::Value& schema, const Json::Value& value,
                              const Place& place) {
  bool fits = true;
  if (const Json::Value* all = find(schema, "allOf")) {
    for (const Json::Value& each : *all) {
      fits = Check(each, value, place, "allOf") && fits;
    }
  }
  const Json::Value* any = find(schema, "anyOf");
  if (any != nullptr && CountFitting(*any, value, place) == 0) {
    fits = Fail(place, "anyOf", "must be of one of the kinds that are allowed");
  }
  const Json::Value* one = find(schema, "oneOf");
  if (one != nullptr && CountFitting(*one, value, place) != 1) {
    fits = Fail(place, "oneOf", "must be of just one of the kinds that are allowed");
  }
  const Json::Value* none = find(schema, "not");
  if (none != nullptr && Probe(*none, value, place)) {
    fits = Fail(place, "not", "must not be of the kind that is excluded");
  }
  return fits && !isExhausted_;
}

bool Validator::CheckCondition(const Json::Value& schema, const Json::Value& value,
                               const Place& place) {
  const Json::Value* condition = find(schema, "if");
  if (condition == nullptr) {
    return true;
  }
  const char* rule = Probe(*condition, value, place) ? "then" : "else";
  const Json::Value* then = find(schema, rule);
  return then == nullptr || Check(*then, value, place, rule);
}

}  // namespace QELO::Platform
