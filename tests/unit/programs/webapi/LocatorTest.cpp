#include "programs/webapi/text/Locator.h"

#include <gtest/gtest.h>

#include "programs/webapi/text/DescriptionText.h"

namespace QELO::AuthorProgram {
namespace {

/// What stands where a value is said to stand, up to the next blank.
std::string textAt(const std::string& text, ptrdiff_t offset) {
  const auto start = static_cast<size_t>(offset);
  return text.substr(start, text.find_first_of(" \n", start) - start);
}

TEST(Locator, ValuesAndNamesKnowTheirPlaces) {
  const std::string text =
      "// {\n{ \"a\\u0062\" : 1 , /* } */ \"list\" : [ true , \"x\\\"]\" , {} ] , \"o\" : { \"n\" "
      ": null } }";
  DescriptionText description;
  ASSERT_EQ(description.ReadText("f", text), "");
  const Json::Value& root = description.Root();
  EXPECT_EQ(root.getOffsetStart(), 5);
  EXPECT_EQ(textAt(text, root["ab"].getOffsetLimit()), "\"a\\u0062\"");
  EXPECT_EQ(textAt(text, root["ab"].getOffsetStart()), "1");
  EXPECT_EQ(textAt(text, root["list"].getOffsetLimit()), "\"list\"");
  EXPECT_EQ(textAt(text, root["list"][0U].getOffsetStart()), "true");
  EXPECT_EQ(textAt(text, root["list"][1].getOffsetStart()), "\"x\\\"]\"");
  EXPECT_EQ(textAt(text, root["list"][2].getOffsetStart()), "{}");
  EXPECT_EQ(textAt(text, root["o"]["n"].getOffsetStart()), "null");
  EXPECT_TRUE(description.Twices().empty());
}

TEST(Locator, NameThatStandsTwice_IsToldOnceWithItsPlace_AndTheLastCounts) {
  const std::string text = R"({"a": {"b": 1}, "c": 2, "a": {"b": 3}})";
  DescriptionText description;
  ASSERT_EQ(description.ReadText("f", text), "");
  ASSERT_EQ(description.Twices().size(), 1U);
  EXPECT_EQ(description.Twices()[0].name, "a");
  EXPECT_EQ(description.Twices()[0].offset, text.rfind("\"a\""));
  EXPECT_EQ(description.Root()["a"]["b"].getOffsetStart(), static_cast<ptrdiff_t>(text.find("3}")));
}

TEST(Locator, EndsWithTextsThatAreNotTheirValues) {
  for (const char* text : {"", "{", "[", "{\"", "{\"a\"", "{\"a\":", "[,", "{,}", "/*", "\"\\"}) {
    Json::Value root;
    EXPECT_TRUE(Locate(text, root).empty()) << text;
  }
}

TEST(DescriptionText, FaultHasItsPlace) {
  DescriptionText description;
  EXPECT_EQ(description.ReadText("dir/f.lib", "{\n  \"\xC3\xA4\" 1}"),
            "dir/f.lib:2:7: error: no JSON from here on");
}

}  // namespace
}  // namespace QELO::AuthorProgram
