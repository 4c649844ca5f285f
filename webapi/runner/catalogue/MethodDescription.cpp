#include "webapi/MethodDescription.h"

#include "webapi/JsonHelper.h"
#include "webapi/base/Number.h"
#include "webapi/json/SchemaReference.h"
#include "webapi/platform/Schema.h"

namespace QELO {
namespace {

using JsonHelper::find;
using JsonHelper::member;
using Faults = std::vector<MethodDescription::Fault>;

bool isErrorCode(const std::string& text, int& code) {
  return ParseNumber(text, code) && code >= MethodDescription::kFirstOwnError &&
         std::to_string(code) == text;
}

std::string textOf(const Json::Value& attributes, const char* key) {
  const Json::Value& text = member(attributes, key);
  return text.isString() ? text.asString() : "";
}

void checkSchema(const Json::Value& schema, const std::string& path, Faults& faults) {
  std::vector<Schema::Fault> found;
  const Schema::Verdict verdict = Schema::Check(schema, found);
  if (verdict == Schema::Verdict::kUnreadable) {
    faults.push_back({path, "schemas cannot be read on this host"});
  }
  for (const Schema::Fault& fault : found) {
    faults.push_back({path + fault.path, fault.message});
  }
}

void checkErrors(const Json::Value& errors, Faults& faults) {
  if (!errors.isObject()) {
    faults.push_back({"/errors", "must be an object of codes to texts"});
    return;
  }
  for (auto it = errors.begin(); it != errors.end(); ++it) {
    int code = 0;
    if (!isErrorCode(it.name(), code)) {
      faults.push_back({"/errors/" + it.name(), "codes of an API are integers from 400 on"});
    } else if (!it->isString()) {
      faults.push_back({"/errors/" + it.name(), "must be a text"});
    }
  }
}

/// Writes a schema out, with what its references lead to.
class Expansion {
 public:
  static constexpr int kDeepest = 32;        ///< references within what references lead to
  static constexpr int kMostValues = 50000;  ///< of the whole, nested ones counted

  explicit Expansion(const Json::Value& root) : root_(root) {}

  /// @return false when a reference leads nowhere, or there is no end to them
  bool Write(const Json::Value& schema, Json::Value& written, int depth) {
    const bool isReference = member(schema, "$ref").isString();
    const Json::Value* meant = isReference ? FindReferred(root_, schema) : &schema;
    if (isReference) {
      ++depth;
    }
    if (meant == nullptr || depth > kDeepest || ++count_ > kMostValues) {
      return false;
    }
    if (!meant->isObject() && !meant->isArray()) {
      written = *meant;
      return true;
    }
    written = Json::Value(meant->type());
    for (auto it = meant->begin(); it != meant->end(); ++it) {
      if (meant == &root_ && it.name() == "definitions") {
        continue;
      }
      Json::Value& part = meant->isObject() ? written[it.name()] : written.append(Json::Value());
      if (!Write(*it, part, depth)) {
        return false;
      }
    }
    return true;
  }

 private:
  const Json::Value& root_;
  int count_ = 0;
};

}  // namespace

std::string MethodDescription::GetSummary() const {
  return textOf(attributes_, "summary");
}

std::string MethodDescription::GetText() const {
  return textOf(attributes_, "description");
}

const Json::Value& MethodDescription::GetParams() const {
  return member(attributes_, "params");
}

const Json::Value& MethodDescription::GetReturns() const {
  return member(attributes_, "returns");
}

const Json::Value& MethodDescription::GetExample() const {
  return member(attributes_, "example");
}

std::map<int, std::string> MethodDescription::GetErrors() const {
  std::map<int, std::string> errors;
  const Json::Value& texts = member(attributes_, "errors");
  for (auto it = texts.begin(); texts.isObject() && it != texts.end(); ++it) {
    int code = 0;
    if (isErrorCode(it.name(), code) && it->isString()) {
      errors[code] = it->asString();
    }
  }
  return errors;
}

const std::vector<std::string>& MethodDescription::Keys() {
  static const std::vector<std::string> keys{"summary", "description", "params",
                                             "returns", "errors",      "example"};
  return keys;
}

std::vector<MethodDescription::Fault> MethodDescription::Faults() const {
  std::vector<Fault> faults;
  for (const char* key : {"summary", "description"}) {
    const Json::Value* text = find(attributes_, key);
    if (text != nullptr && !text->isString()) {
      faults.push_back({std::string("/") + key, "must be a text"});
    }
  }
  if (const Json::Value* params = find(attributes_, "params")) {
    const Json::Value* type = find(*params, "type");
    if (!params->isObject()) {
      faults.push_back({"/params", "must be an object, a schema"});
    } else if (type != nullptr && !JsonHelper::isText(*type, "object")) {
      faults.push_back({"/params/type", "must be \"object\": parameters are its members"});
    }
    checkSchema(*params, "/params", faults);
  }
  if (const Json::Value* returns = find(attributes_, "returns")) {
    checkSchema(*returns, "/returns", faults);
  }
  if (const Json::Value* errors = find(attributes_, "errors")) {
    checkErrors(*errors, faults);
  }
  const Json::Value* example = find(attributes_, "example");
  if (example != nullptr && !example->isObject()) {
    faults.push_back({"/example", "must be an object of parameters"});
  }
  return faults;
}

Json::Value MethodDescription::Expand(const Json::Value& schema) {
  Json::Value written;
  return Expansion(schema).Write(schema, written, 0) ? written : Json::Value();
}

}  // namespace QELO
