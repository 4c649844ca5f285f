#include "programs/webapi/check/CheckSchema.h"

#include <gtest/gtest.h>

namespace QELO::AuthorProgram {
namespace {

/// What is found in a schema, without places; "" when nothing.
std::string foundIn(const std::string& text) {
  DescriptionText schema;
  EXPECT_EQ(schema.ReadText("s", text), "");
  Findings findings;
  CheckSchema(schema.Root(), findings);
  std::string found;
  for (const std::string& line : findings.Lines("s", schema)) {
    found += (found.empty() ? "" : "\n") + line.substr(line.find("error: ") + 7);
  }
  return found;
}

TEST(CheckSchema, UsualSchemasAreGood) {
  EXPECT_EQ(foundIn("true"), "");
  EXPECT_EQ(foundIn("{}"), "");
  EXPECT_EQ(foundIn(R"({"type": "object", "required": ["a"], "additionalProperties": false,
      "properties": {"a": {"type": ["string", "null"], "minLength": 1, "maxLength": 5, "pattern": "^a+$"},
        "b": {"type": "integer", "minimum": -1, "maximum": 1.5, "default": 0, "title": "B"},
        "c": {"items": [{"enum": [1]}], "additionalItems": true, "uniqueItems": true},
        "d": {"oneOf": [{"$ref": "#/definitions/d"}, {"not": {"const": null}}]}},
      "dependencies": {"a": ["b"], "b": {}}, "definitions": {"d": {"format": "date"}}})"),
            "");
}

TEST(CheckSchema, WhatIsNoSchemaIsToldWithTheReason) {
  EXPECT_EQ(foundIn("5"), "a schema is an object, not an integer");
  EXPECT_EQ(foundIn(R"({"type": "strng"})"),
            "there is no type \"strng\"; did you mean \"string\"?");
  EXPECT_EQ(foundIn(R"({"type": ["string", 1]})"), "a \"type\" is a text, not an integer");
  EXPECT_EQ(foundIn(R"({"minimun": 1})"), "no schema has \"minimun\"; did you mean \"minimum\"?");
  EXPECT_EQ(foundIn(R"({"minimum": "1"})"), "\"minimum\" is a number");
  EXPECT_EQ(foundIn(R"({"maxLength": -1})"), "\"maxLength\" is an integer from 0 on");
  EXPECT_EQ(foundIn(R"({"maxLength": 1.5})"), "\"maxLength\" is an integer from 0 on");
  EXPECT_EQ(foundIn(R"({"multipleOf": 0})"), "\"multipleOf\" is a number above 0");
  EXPECT_EQ(foundIn(R"({"required": "a"})"), "\"required\" is a list of names, each once");
  EXPECT_EQ(foundIn(R"({"required": ["a", "a"]})"), "\"required\" is a list of names, each once");
  EXPECT_EQ(foundIn(R"({"enum": []})"), "\"enum\" is a list with a value");
  EXPECT_EQ(foundIn(R"({"pattern": 5})"), "\"pattern\" is a text");
  EXPECT_EQ(foundIn(R"({"properties": []})"), "\"properties\" is an object of schemas");
  EXPECT_EQ(foundIn(R"({"anyOf": []})"), "\"anyOf\" is a list of schemas");
  EXPECT_EQ(foundIn(R"({"minLength": 5, "maxLength": 4})"),
            "\"minLength\" is above \"maxLength\", so no value is good");
}

TEST(CheckSchema, FaultsAreFoundWhereverTheyAreNested) {
  for (const char* around :
       {R"({"properties": {"x": %}})", R"({"items": %})", R"({"items": [{}, %]})",
        R"({"additionalProperties": %})", R"({"allOf": [%]})", R"({"if": {}, "then": %})",
        R"({"definitions": {"x": %}})", R"({"dependencies": {"x": %}})", R"({"not": %})"}) {
    std::string text = around;
    text.replace(text.find('%'), 1, R"({"type": "text"})");
    EXPECT_EQ(foundIn(text), "there is no type \"text\"") << text;
  }
}

}  // namespace
}  // namespace QELO::AuthorProgram
