#include <gtest/gtest.h>

#include "tests/unit/schema/Fixture.h"

namespace QELO::Platform {
namespace {

TEST(SchemaCheck, TakesWhatDraft7KnowsAndLeavesTheRestAlone) {
  for (
      const char* schema : {
          "true",
          "false",
          "{}",
          R"({"x-own": 5, "example": [1], "deprecated": true})",
          R"({"$schema": "http://json-schema.org/draft-07/schema#", "title": "t", "$comment": "c"})",
          R"({"type": ["string", "null"], "enum": ["a", null], "const": 1, "default": {}})",
          R"({"multipleOf": 0.5, "maximum": 1, "exclusiveMinimum": -1.5, "minLength": 0})",
          R"({"maxLength": 5.0, "pattern": "^a", "format": "made-up", "uniqueItems": true})",
          R"({"items": [true, {}], "additionalItems": false, "contains": {"type": "null"}})",
          R"({"properties": {"$ref": {"type": "string"}}, "patternProperties": {"^x": true}})",
          R"({"dependencies": {"a": ["b"], "c": {"required": ["d"]}}, "required": []})",
          R"({"if": true, "then": {}, "else": false, "allOf": [{}], "not": {"anyOf": [{}]}})",
          R"({"properties": {"a": {"$ref": "#/definitions/b"}}, "definitions": {"b": {}}})",
      }) {
    EXPECT_EQ(SchemaFaults(schema), Lines()) << schema;
  }
}

TEST(SchemaCheck, TellsWhereASchemaIsNone) {
  struct Case {
    const char* schema;
    const char* fault;
  };
  for (const Case& each : {
           Case{"5", " type"},
           Case{R"({"type": "text"})", "/type type"},
           Case{R"({"type": []})", "/type type"},
           Case{R"({"type": ["string", 5]})", "/type type"},
           Case{R"({"enum": []})", "/enum enum"},
           Case{R"({"enum": "a"})", "/enum enum"},
           Case{R"({"multipleOf": 0})", "/multipleOf multipleOf"},
           Case{R"({"multipleOf": -1})", "/multipleOf multipleOf"},
           Case{R"({"maximum": "5"})", "/maximum maximum"},
           Case{R"({"exclusiveMaximum": true})", "/exclusiveMaximum exclusiveMaximum"},
           Case{R"({"maxLength": -1})", "/maxLength maxLength"},
           Case{R"({"minItems": 1.5})", "/minItems minItems"},
           Case{R"({"pattern": 5})", "/pattern pattern"},
           Case{R"({"pattern": "("})", "/pattern pattern"},
           Case{R"({"format": 1})", "/format format"},
           Case{R"({"uniqueItems": 1})", "/uniqueItems uniqueItems"},
           Case{R"({"required": "name"})", "/required required"},
           Case{R"({"required": [1]})", "/required required"},
           Case{R"({"properties": []})", "/properties properties"},
           Case{R"({"properties": {"a/b": {"type": "x"}}})", "/properties/a~1b/type type"},
           Case{R"({"patternProperties": {"[": true}})", "/patternProperties/[ patternProperties"},
           Case{R"({"additionalProperties": 1})", "/additionalProperties type"},
           Case{R"({"items": [{"type": 1}]})", "/items/0/type type"},
           Case{R"({"items": "string"})", "/items type"},
           Case{R"({"allOf": {}})", "/allOf allOf"},
           Case{R"({"anyOf": []})", "/anyOf anyOf"},
           Case{R"({"not": []})", "/not type"},
           Case{R"({"dependencies": {"a": [1]}})", "/dependencies/a dependencies"},
           Case{R"({"dependencies": []})", "/dependencies dependencies"},
           Case{R"({"definitions": {"unused": {"type": 5}}})", "/definitions/unused/type type"},
           Case{R"({"$ref": "#/definitions/none"})", "/$ref $ref"},
           Case{R"({"$ref": "http://example.com/x"})", "/$ref $ref"},
           Case{R"({"$ref": 5})", "/$ref $ref"},
       }) {
    EXPECT_EQ(SchemaFaults(each.schema), Lines{each.fault}) << each.schema;
  }
}

TEST(SchemaCheck, RefusesCircles) {
  for (
      const char* schema : {
          R"({"$ref": "#"})",
          R"({"definitions": {"a": {"$ref": "#/definitions/b"}, "b": {"$ref": "#/definitions/a"}}})",
          R"({"properties": {"child": {"$ref": "#"}}})",
          R"({"allOf": [{"$ref": "#"}, {"$ref": "#"}, {"$ref": "#"}]})",
      }) {
    const Lines faults = SchemaFaults(schema);
    ASSERT_FALSE(faults.empty()) << schema;
    EXPECT_NE(faults[0].find("$ref"), std::string::npos) << faults[0];
  }
}

TEST(SchemaCheck, SizeAndDepthAreBounded) {
  std::string deep = "true";
  for (int i = 0; i < 40; ++i) {
    deep = R"({"not": )" + deep + "}";
  }
  EXPECT_EQ(SchemaFaults(deep), Lines{" $ref"});
  Json::Value wide;
  for (int i = 0; i < 1001; ++i) {
    wide["properties"]["p" + std::to_string(i)]["type"] = "string";
  }
  EXPECT_EQ(SchemaFaults(JsonHelper::toString(wide)), Lines{" $ref"});
  Json::Value doubling;  // each leads twice to the next
  for (int i = 0; i < 30; ++i) {
    Json::Value& both = doubling["definitions"]["d" + std::to_string(i)]["allOf"];
    both[0]["$ref"] = both[1]["$ref"] = "#/definitions/d" + std::to_string(i + 1);
  }
  doubling["definitions"]["d30"] = true;
  EXPECT_EQ(SchemaFaults(JsonHelper::toString(doubling)), Lines{" $ref"});
  Json::Value choices;
  for (int i = 0; i < 1001; ++i) {
    choices["enum"].append(i);
  }
  EXPECT_EQ(SchemaFaults(JsonHelper::toString(choices)), Lines{"/enum enum"});
}

}  // namespace
}  // namespace QELO::Platform
