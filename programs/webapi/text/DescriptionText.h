#pragma once

#include <json/json.h>

#include <string>
#include <string_view>
#include <vector>

#include "programs/webapi/text/Locator.h"
#include "webapi/json/Fault.h"

namespace QELO::AuthorProgram {

/// A description file's text with the values in it, which know where they stand.
class DescriptionText {
 public:
  static constexpr size_t kLongest = 1U << 20U;  ///< bytes of a file
  static constexpr size_t kMostValues = 50000;   ///< nested ones counted

  /// Reads a file, or a text as if it was one.
  /// @return what is wrong, beginning with the file's name and the place if there is one; "" if
  ///         nothing is
  std::string ReadFile(const std::string& path);
  std::string ReadText(const std::string& path, std::string text);

  const Json::Value& Root() const { return root_; }
  /// The members that stand twice in an object.
  const std::vector<Twice>& Twices() const { return twices_; }
  JsonHelper::Position PositionAt(size_t offset) const {
    return JsonHelper::positionAt(text_, offset);
  }

 private:
  std::string text_;
  Json::Value root_;
  std::vector<Twice> twices_;
};

/// Versions of an API, and methods of a version, that are looked at.
inline constexpr Json::ArrayIndex kMostEntries = 1000;

/// What is too much in an API's description to be looked at; "" when nothing is.
std::string TooMuchIn(const Json::Value& description);

/// "FILE:LINE:COLUMN: "
std::string PlaceText(const std::string& path, const JsonHelper::Position& position);

}  // namespace QELO::AuthorProgram
