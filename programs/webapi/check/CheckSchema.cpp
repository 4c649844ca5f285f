#include "programs/webapi/check/CheckSchema.h"

#include <algorithm>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "programs/webapi/check/TypeName.h"
#include "programs/webapi/check/Words.h"
#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

/// What the value of a keyword is.
enum class Form : uint8_t {
  kSchema,
  kSchemas,        ///< a list of them, not empty
  kSchemaOrList,   ///< one, or a list of them
  kSchemasByName,  ///< an object of them
  kDependencies,   ///< an object of schemas and lists of names
  kNumber,
  kPositive,  ///< a number above 0
  kCount,     ///< an integer from 0 on
  kBoolean,
  kText,
  kNames,  ///< a list of different texts
  kTypes,
  kValues,  ///< a list, not empty
  kAny,
};

struct Keyword {
  std::string_view name;
  Form form;
};

constexpr Keyword kKeywords[] = {
    {"type", Form::kTypes},
    {"properties", Form::kSchemasByName},
    {"required", Form::kNames},
    {"additionalProperties", Form::kSchema},
    {"patternProperties", Form::kSchemasByName},
    {"propertyNames", Form::kSchema},
    {"minProperties", Form::kCount},
    {"maxProperties", Form::kCount},
    {"dependencies", Form::kDependencies},
    {"items", Form::kSchemaOrList},
    {"additionalItems", Form::kSchema},
    {"contains", Form::kSchema},
    {"minItems", Form::kCount},
    {"maxItems", Form::kCount},
    {"uniqueItems", Form::kBoolean},
    {"minLength", Form::kCount},
    {"maxLength", Form::kCount},
    {"pattern", Form::kText},
    {"format", Form::kText},
    {"minimum", Form::kNumber},
    {"maximum", Form::kNumber},
    {"exclusiveMinimum", Form::kNumber},
    {"exclusiveMaximum", Form::kNumber},
    {"multipleOf", Form::kPositive},
    {"enum", Form::kValues},
    {"const", Form::kAny},
    {"allOf", Form::kSchemas},
    {"anyOf", Form::kSchemas},
    {"oneOf", Form::kSchemas},
    {"not", Form::kSchema},
    {"if", Form::kSchema},
    {"then", Form::kSchema},
    {"else", Form::kSchema},
    {"definitions", Form::kSchemasByName},
    {"title", Form::kText},
    {"description", Form::kText},
    {"default", Form::kAny},
    {"examples", Form::kValues},
    {"readOnly", Form::kBoolean},
    {"writeOnly", Form::kBoolean},
    {"contentEncoding", Form::kText},
    {"contentMediaType", Form::kText},
    {"$id", Form::kText},
    {"$schema", Form::kText},
    {"$ref", Form::kText},
    {"$comment", Form::kText},
};

const std::vector<std::string_view>& typeNames() {
  static const std::vector<std::string_view> names = {"string", "integer", "number", "boolean",
                                                      "array",  "object",  "null"};
  return names;
}

bool isCount(const Json::Value& value) {
  return value.isUInt64() && value.type() != Json::realValue;
}

class SchemaCheck {
 public:
  explicit SchemaCheck(Findings& findings) : findings_(findings) {}

  void Schema(const Json::Value& schema) {
    if (schema.isBool()) {
      return;
    }
    if (schema.type() != Json::objectValue) {
      Refuse(schema, std::string("a schema is an object, not ") + NameOfType(schema));
      return;
    }
    for (auto it = schema.begin(); it != schema.end() && !findings_.IsFull(); ++it) {
      const std::string name = it.name();
      const auto known = std::find_if(std::begin(kKeywords), std::end(kKeywords),
                                      [&](const Keyword& word) { return word.name == name; });
      if (known == std::end(kKeywords)) {
        findings_.AddAtName(Findings::kError, *it,
                            "no schema has " + Quoted(name) + Suggestion(name, Names()));
      } else {
        Value(*known, *it);
      }
    }
    Bounds(schema);
  }

 private:
  static std::vector<std::string_view> Names() {
    std::vector<std::string_view> names;
    for (const Keyword& word : kKeywords) {
      names.push_back(word.name);
    }
    return names;
  }

  void Refuse(const Json::Value& at, const std::string& text) {
    findings_.Add(Findings::kError, at, text);
  }

  void Demand(bool isGood, const Keyword& word, const Json::Value& value, const char* form) {
    if (!isGood) {
      Refuse(value, Quoted(word.name) + " is " + form);
    }
  }

  void Value(const Keyword& word, const Json::Value& value) {
    switch (word.form) {
      case Form::kNumber:
        return Demand(value.isNumeric() && !value.isBool(), word, value, "a number");
      case Form::kPositive:
        return Demand(value.isNumeric() && !value.isBool() && value.asDouble() > 0, word, value,
                      "a number above 0");
      case Form::kCount:
        return Demand(isCount(value), word, value, "an integer from 0 on");
      case Form::kBoolean:
        return Demand(value.isBool(), word, value, "true or false");
      case Form::kText:
        return Demand(value.isString(), word, value, "a text");
      case Form::kNames:
        return NameList(word, value);
      case Form::kTypes:
        return Types(value);
      case Form::kValues:
        return Demand(value.isArray() && !value.empty(), word, value, "a list with a value");
      case Form::kAny:
        return;
      default:
        return Nested(word, value);
    }
  }

  void Nested(const Keyword& word, const Json::Value& value) {
    if (word.form == Form::kSchema || (word.form == Form::kSchemaOrList && !value.isArray())) {
      return Schema(value);
    }
    const bool isByName = word.form == Form::kSchemasByName || word.form == Form::kDependencies;
    if (isByName ? value.type() != Json::objectValue : !value.isArray() || value.empty()) {
      return Demand(false, word, value, isByName ? "an object of schemas" : "a list of schemas");
    }
    for (const Json::Value& entry : value) {
      if (word.form == Form::kDependencies && entry.isArray()) {
        NameList(word, entry);
      } else {
        Schema(entry);
      }
    }
  }

  void NameList(const Keyword& word, const Json::Value& value) {
    std::set<std::string> seen;
    bool isGood = value.isArray();
    for (Json::ArrayIndex i = 0; isGood && i < value.size(); ++i) {
      isGood = value[i].isString() && seen.insert(value[i].asString()).second;
    }
    Demand(isGood, word, value, "a list of names, each once");
  }

  void Types(const Json::Value& value) {
    if (value.isArray() && !value.empty()) {
      for (const Json::Value& entry : value) {
        Type(entry);
      }
    } else {
      Type(value);
    }
  }

  void Type(const Json::Value& value) {
    const std::string name = value.isString() ? value.asString() : "";
    const auto& names = typeNames();
    if (!value.isString()) {
      Refuse(value, std::string("a \"type\" is a text, not ") + NameOfType(value));
    } else if (std::find(names.begin(), names.end(), name) == names.end()) {
      Refuse(value, "there is no type " + Quoted(name) + Suggestion(name, names));
    }
  }

  /// Bounds that no value keeps.
  void Bounds(const Json::Value& schema) {
    for (const auto& [low, high] : {std::pair{"minimum", "maximum"},
                                    {"minLength", "maxLength"},
                                    {"minItems", "maxItems"},
                                    {"minProperties", "maxProperties"}}) {
      const Json::Value& least = JsonHelper::member(schema, low);
      const Json::Value& most = JsonHelper::member(schema, high);
      if (least.isNumeric() && most.isNumeric() && least.asDouble() > most.asDouble()) {
        Refuse(least, Quoted(low) + " is above " + Quoted(high) + ", so no value is good");
      }
    }
  }

  Findings& findings_;
};

}  // namespace

void CheckSchema(const Json::Value& schema, Findings& findings) {
  SchemaCheck(findings).Schema(schema);
}

void CheckObjectSchema(const Json::Value& schema, Findings& findings) {
  CheckSchema(schema, findings);
  const Json::Value* type = JsonHelper::find(schema, "type");
  if (type != nullptr && !JsonHelper::isText(*type, "object")) {
    findings.Add(Findings::kError, *type, "parameters are an object: \"type\" is \"object\"");
  }
}

}  // namespace QELO::AuthorProgram
