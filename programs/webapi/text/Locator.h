#pragma once

#include <json/json.h>

#include <string>
#include <string_view>
#include <vector>

namespace QELO::AuthorProgram {

/// A member that an object has a second time; the last one counts.
struct Twice {
  size_t offset;  ///< of the later name
  std::string name;
};

/// Tells the values of a text where they stand in it: in bytes from its front, getOffsetStart() is
/// the value's place, and of an object's member getOffsetLimit() that of its name.
/// @param text   what readJsonText() has read, comments and all
/// @param root   the value that it has given
/// @return the members that stand there twice, in the text's order
std::vector<Twice> Locate(std::string_view text, Json::Value& root);

}  // namespace QELO::AuthorProgram
