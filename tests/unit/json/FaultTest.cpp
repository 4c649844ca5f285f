#include "webapi/json/Fault.h"

#include <gtest/gtest.h>

namespace QELO::JsonHelper {
namespace {

/// "line:column" of the fault, or "none".
std::string faultOf(std::string_view text) {
  Position fault;
  return findFault(text, fault) ? std::to_string(fault.line) + ":" + std::to_string(fault.column)
                                : "none";
}

TEST(JsonFault, TextThatIsJsonHasNone) {
  EXPECT_EQ(faultOf("{\"a\": [1, true, null]}"), "none");
  EXPECT_EQ(faultOf("// a comment\n{}\n"), "none");
}

TEST(JsonFault, IsWhereTheFirstWrongCharacterStands) {
  EXPECT_EQ(faultOf(""), "1:1");
  EXPECT_EQ(faultOf("not json"), "1:1");
  EXPECT_EQ(faultOf("{\n  \"a\": 1\n  \"b\": 2\n}"), "3:3");
  EXPECT_EQ(faultOf("{\"a\" 1}"), "1:6");
  EXPECT_EQ(faultOf("[1, 2,]"), "1:7");
  EXPECT_EQ(faultOf("{} x"), "1:4");
  EXPECT_EQ(faultOf("[tru]"), "1:2");
}

TEST(JsonFault, IsTheEndWhereSomethingIsMissing) {
  EXPECT_EQ(faultOf("{\"a\": 1"), "1:8");
  EXPECT_EQ(faultOf("[\n"), "2:1");
  EXPECT_EQ(faultOf("\"open"), "1:6");
}

TEST(JsonFault, ColumnsAreCharacters) {
  EXPECT_EQ(faultOf("[\"\xC3\xA4\xE2\x82\xAC\" 1]"), "1:7");
}

TEST(JsonFault, IsTheBracketThatIsTooDeep) {
  EXPECT_EQ(faultOf(std::string(300, '[')), "1:257");
}

TEST(JsonFault, FileThatCannotBeReadHasNone) {
  Position fault;
  EXPECT_FALSE(findFileFault("/nonexistent", fault));
  EXPECT_FALSE(findFileFault("/", fault));
}

}  // namespace
}  // namespace QELO::JsonHelper
