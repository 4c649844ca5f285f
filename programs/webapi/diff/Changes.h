#pragma once

#include <json/json.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "programs/webapi/text/DescriptionText.h"

namespace QELO::AuthorProgram {

/// What has changed from one description to another, each with its place in one of them.
class Changes {
 public:
  enum Kind : uint8_t {
    kBreaks,   ///< a caller of the old one may fail, or understand the answer no longer
    kChanges,  ///< callers need do nothing, but should know
    kNew,      ///< something more can be called
  };
  enum Side : uint8_t { kOld, kNewer };

  /// @param at  a value of that side's text
  void Add(Kind kind, Side side, const Json::Value& at, const std::string& text) {
    found_.push_back({kind, side, at.getOffsetStart(), text});
  }
  /// @param member  the member of an object whose name is meant
  void AddAtName(Kind kind, Side side, const Json::Value& member, const std::string& text) {
    found_.push_back({kind, side, member.getOffsetLimit(), text});
  }

  bool IsFull() const { return found_.size() >= kMost; }
  bool Breaks() const;
  /// The lines to print, in the order in which they were found.
  /// @param breaksAlone  leaves the others out
  std::vector<std::string> Lines(const std::string (&paths)[2], const DescriptionText (&texts)[2],
                                 bool breaksAlone) const;

 private:
  static constexpr size_t kMost = 200;  // that are looked for

  struct Change {
    Kind kind;
    Side side;
    ptrdiff_t offset;
    std::string text;
  };

  std::vector<Change> found_;
};

}  // namespace QELO::AuthorProgram
