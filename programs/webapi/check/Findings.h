#pragma once

#include <json/json.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "programs/webapi/text/DescriptionText.h"

namespace QELO::AuthorProgram {

/// What is found in one description file, each with its place.
class Findings {
 public:
  static constexpr size_t kMost = 100;  ///< that are shown of a file, and looked for

  enum Weight : uint8_t {
    kError,    ///< calls would fail, or would be made in another way than it says
    kWarning,  ///< it is of no use
  };

  /// @param at  a value of the text
  void Add(Weight weight, const Json::Value& at, const std::string& text) {
    Put(weight, at.getOffsetStart(), text);
  }
  /// @param member  the member of an object whose name is meant
  void AddAtName(Weight weight, const Json::Value& member, const std::string& text) {
    Put(weight, member.getOffsetLimit(), text);
  }
  void Put(Weight weight, ptrdiff_t offset, const std::string& text);

  bool IsFull() const { return found_.size() >= kMost; }
  /// The lines to print, in the text's order.
  std::vector<std::string> Lines(const std::string& path, const DescriptionText& text) const;
  size_t Errors() const;

 private:
  struct Finding {
    Weight weight;
    size_t offset;
    std::string text;
  };

  std::vector<Finding> found_;
};

}  // namespace QELO::AuthorProgram
