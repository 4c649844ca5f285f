#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace QELO::Platform {

/// A regular expression of a schema: what of ECMA 262 can be matched in one pass over the text,
/// that is all but back-references and looking around. So no expression makes a text cost more than
/// its length times the expression's, which std::regex and the like do not promise.
class Pattern {
 public:
  static constexpr size_t kLongest = 1024;    ///< bytes of an expression
  static constexpr size_t kMostSteps = 2000;  ///< of its program, repetitions written out
  static constexpr int kDeepest = 32;         ///< groups within groups

  using Range = std::pair<char32_t, char32_t>;  ///< code points, both included
  using Ranges = std::vector<Range>;

  /// One step of the program; the others are counted from here.
  struct Step {
    enum Kind : uint8_t { kOneOf, kEither, kJump, kBegin, kEnd, kWordEdge, kNoWordEdge, kFound };
    Kind kind;
    int first = 1;   ///< where to go on; for kOneOf which set
    int second = 1;  ///< for kEither: where else
  };

  /// @param reason  receives why the expression is none
  /// @return false when it is none
  static bool Read(std::string_view expression, Pattern& pattern, std::string& reason);

  /// Whether the expression matches somewhere in the text.
  /// @param work  how many steps may be taken, of which those taken are subtracted; the answer is
  ///              false when there are not enough, and `work` 0
  bool IsIn(std::string_view text, size_t& work) const;

 private:
  friend class PatternReader;

  bool Holds(int set, char32_t point) const;

  std::vector<Step> steps_;
  std::vector<Ranges> sets_;
};

/// The code point at the front of a text, which it is taken off. A byte that is no part of UTF-8 is
/// a point of its own, beyond all others.
char32_t takePoint(std::string_view& text);

}  // namespace QELO::Platform
