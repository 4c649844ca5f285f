// A schema with every kind of declaration, and two hundred inputs that do not fit it, each with the
// fields that are told.

#include <algorithm>

#include "tests/unit/schema/Fixture.h"
#include "tests/unit/schema/WrongInputs.h"

namespace QELO::Platform {
namespace {

constexpr char kSchema[] = R"JSON({
  "type": "object",
  "required": ["name"],
  "additionalProperties": false,
  "properties": {
    "name": {"type": "string", "minLength": 1, "maxLength": 8, "pattern": "^[a-z]+$"},
    "size": {"type": "integer", "minimum": 1, "maximum": 100},
    "large": {"type": "integer", "maximum": 9007199254740992},
    "ratio": {"type": "number", "exclusiveMinimum": 0, "exclusiveMaximum": 1},
    "step": {"type": "number", "multipleOf": 0.1},
    "even": {"type": "integer", "multipleOf": 2},
    "on": {"type": "boolean"},
    "none": {"type": "null"},
    "text": {"type": "string"},
    "either": {"type": ["integer", "null"]},
    "mode": {"enum": ["push", "pull", 5, null]},
    "fixed": {"const": {"a": [1]}},
    "day": {"type": "string", "format": "date"},
    "hour": {"type": "string", "format": "time"},
    "moment": {"type": "string", "format": "date-time"},
    "mail": {"type": "string", "format": "email"},
    "host": {"type": "string", "format": "hostname"},
    "ip4": {"type": "string", "format": "ipv4"},
    "ip6": {"type": "string", "format": "ipv6"},
    "key": {"type": "string", "format": "uuid"},
    "tags": {"type": "array", "items": {"type": "string", "maxLength": 3}, "minItems": 1,
             "maxItems": 3, "uniqueItems": true},
    "pair": {"type": "array", "items": [{"type": "integer"}, {"type": "string"}],
             "additionalItems": false},
    "more": {"items": [true], "additionalItems": {"type": "boolean"}},
    "some": {"type": "array", "contains": {"const": 7}},
    "person": {"type": "object", "required": ["id", "kin"], "properties": {
      "id": {"type": "integer"},
      "kin": {"type": "array", "items": {"type": "object", "required": ["of"],
              "properties": {"of": {"type": "string", "minLength": 2}}, "additionalProperties": false}},
      "a/b~c": {"type": "boolean"}}},
    "map": {"type": "object", "minProperties": 1, "maxProperties": 2,
            "propertyNames": {"pattern": "^[a-z]$"}, "additionalProperties": {"type": "integer"}},
    "coded": {"type": "object", "patternProperties": {"^i": {"type": "integer"}, "^s": {"type": "string"}},
              "additionalProperties": false},
    "card": {"type": "object", "dependencies": {"number": ["holder", "until"],
             "debit": {"required": ["bank"]}}},
    "every": {"allOf": [{"type": "integer"}, {"minimum": 5}, {"maximum": 9}]},
    "any": {"anyOf": [{"type": "integer"}, {"type": "string", "maxLength": 2}]},
    "one": {"oneOf": [{"multipleOf": 3}, {"multipleOf": 5}]},
    "other": {"not": {"type": "string"}},
    "when": {"type": "object", "if": {"properties": {"k": {"const": 1}}, "required": ["k"]},
             "then": {"required": ["one"]}, "else": {"required": ["two"]}},
    "shared": {"$ref": "#/definitions/port"},
    "ports": {"type": "array", "items": {"$ref": "#/definitions/port"}},
    "never": false
  },
  "definitions": {"port": {"type": "integer", "minimum": 0, "maximum": 65535}}
})JSON";

/// Words in place of long values.
std::string written(std::string text) {
  const auto put = [&text](const std::string& word, const std::string& value) {
    for (size_t at = text.find(word); at != std::string::npos; at = text.find(word)) {
      text.replace(at, word.size(), value);
    }
  };
  put("LONG", std::string(100'000, 'x'));
  put("DEEP", std::string(200, '[') + std::string(200, ']'));
  put("NINES", std::string(300, '9'));
  return text;
}

TEST(WrongInputs, EachIsAnsweredWithTheRightFields) {
  const Json::Value schema = Parse(kSchema);
  for (const WrongInput& each : WrongInputs()) {
    const std::string text = written(each.members);
    const std::string object =
        text.substr(0, 1) == "{" ? text : "{\"name\": \"ann\", " + text + "}";
    Lines expected = each.faults;
    Lines told = FaultsOf(schema, Parse(object));
    std::sort(expected.begin(), expected.end());
    std::sort(told.begin(), told.end());
    EXPECT_EQ(told, expected) << each.members;
    EXPECT_FALSE(told.empty()) << each.members;
  }
  EXPECT_GE(WrongInputs().size(), 200U);
}

TEST(WrongInputs, ThoseThatFitAreTaken) {
  for (const char* members : {
           R"("size": 1)",
           R"("size": 100)",
           R"("size": 5.0)",
           R"("large": 9007199254740992)",
           R"("ratio": 0.5)",
           R"("step": 0.3)",
           R"("step": 7)",
           R"("even": -4)",
           R"("even": 0)",
           R"("on": false)",
           R"("none": null)",
           R"("text": "")",
           R"("either": null, "mode": 5.0)",
           R"("mode": null, "fixed": {"a": [1.0]})",
           R"("day": "2024-02-29")",
           R"("hour": "23:59:60.25+01:00", "moment": "2026-01-31t00:00:00z")",
           R"("mail": "a.b+c@d-e.org", "host": "x1.example", "ip4": "10.0.0.255", "ip6": "::1")",
           R"("key": "123e4567-e89b-12d3-a456-426614174000")",
           R"("tags": ["a", "bbb", "c"])",
           R"("pair": [1, "x"])",
           R"("pair": [])",
           R"("more": [5, true])",
           R"("some": [1, 7])",
           R"("person": {"id": 1, "kin": [{"of": "me"}], "a/b~c": true, "x": 1})",
           R"("map": {"a": 1, "b": 2}, "coded": {"i1": 5, "s": ""})",
           R"("card": {"number": 1, "holder": 1, "until": 1})",
           R"("every": 5, "any": "ab", "one": 9)",
           R"("other": 5, "when": {"k": 1, "one": 1}, "shared": 65535, "ports": [0])",
       }) {
    EXPECT_EQ(FaultsOf(Parse(kSchema), Parse("{\"name\": \"ann\", " + std::string(members) + "}")),
              Lines())
        << members;
  }
}

}  // namespace
}  // namespace QELO::Platform
