#include "webapi/MethodDescription.h"

#include <gtest/gtest.h>

#include "tests/support/FakePlatform.h"
#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
  return value;
}

std::vector<std::string> FaultPaths(const std::string& attributes) {
  const Json::Value value = Parse(attributes);
  std::vector<std::string> paths;
  for (const MethodDescription::Fault& fault : MethodDescription(value).Faults()) {
    EXPECT_FALSE(fault.message.empty());
    paths.push_back(fault.path);
  }
  return paths;
}

using Paths = std::vector<std::string>;

class MethodDescriptionTest : public testing::Test {
 protected:
  void SetUp() override { FakePlatform::Reset(); }
};

TEST_F(MethodDescriptionTest, TellsWhatTheAttributesHave) {
  const Json::Value attributes = Parse(R"({
    "summary": "Adds a person", "description": "More", "params": {"type": "object"},
    "returns": {"type": "string"}, "errors": {"401": "no room", "402": 5, "101": "x", "0403": "y"},
    "example": {"name": "Ann"}})");
  const MethodDescription told(attributes);
  EXPECT_EQ(told.GetSummary(), "Adds a person");
  EXPECT_EQ(told.GetText(), "More");
  EXPECT_EQ(told.GetParams(), attributes["params"]);
  EXPECT_EQ(told.GetReturns(), attributes["returns"]);
  EXPECT_EQ(told.GetExample(), attributes["example"]);
  EXPECT_EQ(told.GetErrors(), (std::map<int, std::string>{{401, "no room"}}));
}

TEST_F(MethodDescriptionTest, NothingIsToldOfAttributesWithoutTheKeys) {
  for (const char* text : {"{}", "null", "[]", "\"x\"", R"({"allowDemo": true})"}) {
    const Json::Value attributes = Parse(text);
    const MethodDescription told(attributes);
    EXPECT_EQ(told.GetSummary() + told.GetText(), "");
    EXPECT_TRUE(told.GetParams().isNull());
    EXPECT_TRUE(told.GetErrors().empty());
    EXPECT_EQ(FaultPaths(text), Paths());
  }
  EXPECT_EQ(FakePlatform::Get().calls, Paths()) << "no schema is asked for";
}

TEST_F(MethodDescriptionTest, FaultsNameTheirPlace) {
  EXPECT_EQ(FaultPaths(R"({"summary": 5, "description": []})"),
            (Paths{"/summary", "/description"}));
  EXPECT_EQ(FaultPaths(R"({"params": true})"), Paths{"/params"});
  EXPECT_EQ(FaultPaths(R"({"params": {"type": "array"}})"), Paths{"/params/type"});
  EXPECT_EQ(FaultPaths(R"({"params": {"properties": {"n": {"minimum": "x"}}}})"),
            Paths{"/params/properties/n/minimum"});
  EXPECT_EQ(FaultPaths(R"({"returns": {"type": 5}, "example": 5})"),
            (Paths{"/returns/type", "/example"}));
  EXPECT_EQ(FaultPaths(R"({"errors": {"399": "x", "400": "y", "401": 5}})"),
            (Paths{"/errors/399", "/errors/401"}));
  EXPECT_EQ(FaultPaths(R"({"errors": []})"), Paths{"/errors"});
}

TEST_F(MethodDescriptionTest, AHostWithoutAReaderOfSchemasIsAFault) {
  FakePlatform::Get().readsSchemas = false;
  EXPECT_EQ(FaultPaths(R"({"params": {}})"), Paths{"/params"});
}

TEST_F(MethodDescriptionTest, ExpandPutsWhatReferencesLeadToInTheirPlaces) {
  EXPECT_EQ(
      MethodDescription::Expand(Parse(
          R"({"properties": {"a": {"$ref": "#/definitions/x~1y"}, "b": {"$ref": "#/properties/a"},
                                   "$ref": {"type": "null"}},
                    "definitions": {"x/y": {"items": {"$ref": "#/definitions/z"}},
                                    "z": {"enum": [{"k": 1}]}}})")),
      Parse(R"({"properties": {"a": {"items": {"enum": [{"k": 1}]}},
                                     "b": {"items": {"enum": [{"k": 1}]}},
                                     "$ref": {"type": "null"}}})"));
  EXPECT_TRUE(MethodDescription::Expand(Parse(R"({"$ref": "#"})")).isNull());
  EXPECT_TRUE(MethodDescription::Expand(Parse(R"({"items": {"$ref": "#"}})")).isNull());
  EXPECT_TRUE(MethodDescription::Expand(Parse(R"({"$ref": "#/none"})")).isNull());
  EXPECT_EQ(MethodDescription::Expand(Json::Value(true)), Json::Value(true));
}

}  // namespace
}  // namespace QELO
