// Regular expressions into programs.

#include <algorithm>
#include <iterator>

#include "platform/schema/module/Pattern.h"
#include "webapi/base/Hex.h"

namespace QELO::Platform {
namespace {

constexpr char32_t kLastPoint = 0x10FFFF + 0x100;  // with the bytes that are no UTF-8
constexpr unsigned kMostTimes = 1000;
constexpr unsigned kAnyTimes = ~0U;

using Range = Pattern::Range;
using Ranges = Pattern::Ranges;
using Program = std::vector<Pattern::Step>;
using Step = Pattern::Step;

Ranges without(Ranges ranges) {
  std::sort(ranges.begin(), ranges.end());
  Ranges others;
  char32_t next = 0;
  for (const Range& range : ranges) {
    if (range.first > next) {
      others.emplace_back(next, range.first - 1);
    }
    next = std::max<char32_t>(next, range.second + 1);
  }
  if (next <= kLastPoint) {
    others.emplace_back(next, kLastPoint);
  }
  return others;
}

/// The sets that a letter behind a backslash stands for. @return false for another letter
bool readSet(char32_t letter, Ranges& ranges) {
  switch (letter) {
    case 'd':
    case 'D':
      ranges = {{'0', '9'}};
      break;
    case 'w':
    case 'W':
      ranges = {{'0', '9'}, {'A', 'Z'}, {'_', '_'}, {'a', 'z'}};
      break;
    case 's':
    case 'S':
      ranges = {{9, 13},          {' ', ' '},       {0xA0, 0xA0},     {0x1680, 0x1680},
                {0x2000, 0x200A}, {0x2028, 0x2029}, {0x202F, 0x202F}, {0x205F, 0x205F},
                {0x3000, 0x3000}, {0xFEFF, 0xFEFF}};
      break;
    default:
      return false;
  }
  if (letter < 'a') {
    ranges = without(ranges);
  }
  return true;
}

void append(Program& program, const Program& more) {
  program.insert(program.end(), more.begin(), more.end());
}

int lengthOf(const Program& program) {
  return static_cast<int>(program.size());
}

}  // namespace

/// Reads an expression from front to back; each part becomes a piece of program whose steps count
/// from themselves, so that pieces are put one behind the other.
class PatternReader {
 public:
  PatternReader(std::string_view expression, Pattern& pattern, std::string& reason)
      : rest_(expression), pattern_(pattern), reason_(reason) {}

  bool Read() {
    Program program;
    if (rest_.size() > Pattern::kLongest) {
      return Fail("the expression is too long");
    }
    if (!Alternatives(program, 0)) {
      return false;
    }
    if (!rest_.empty()) {
      return Fail("a \")\" without a \"(\"");
    }
    program.push_back({Step::kFound});
    pattern_.steps_ = std::move(program);
    return true;
  }

 private:
  bool Fail(const char* reason) {
    reason_ = reason;
    return false;
  }
  bool IsNext(char c) const { return !rest_.empty() && rest_.front() == c; }
  bool Take(std::string_view text) {
    const bool isThere = rest_.substr(0, text.size()) == text;
    rest_.remove_prefix(isThere ? text.size() : 0);
    return isThere;
  }
  bool Fits(const Program& program) {
    return program.size() < Pattern::kMostSteps || Fail("the expression repeats too much");
  }
  void PutSet(Ranges ranges, Program& program) {
    program.push_back({Step::kOneOf, static_cast<int>(pattern_.sets_.size())});
    pattern_.sets_.push_back(std::move(ranges));
  }

  bool Alternatives(Program& program, int depth) {
    if (depth > Pattern::kDeepest) {
      return Fail("groups within too many groups");
    }
    if (!Sequence(program, depth)) {
      return false;
    }
    while (Take("|")) {
      Program other;
      if (!Sequence(other, depth)) {
        return false;
      }
      program.push_back({Step::kJump, lengthOf(other) + 1});
      program.insert(program.begin(), {Step::kEither, 1, lengthOf(program) + 1});
      append(program, other);
      if (!Fits(program)) {
        return false;
      }
    }
    return true;
  }

  bool Sequence(Program& program, int depth) {
    while (!rest_.empty() && !IsNext('|') && !IsNext(')')) {
      Program part;
      bool repeats = true;
      if (!Part(part, repeats, depth) || !Times(part, repeats)) {
        return false;
      }
      append(program, part);
      if (!Fits(program)) {
        return false;
      }
    }
    return true;
  }

  /// @param repeats  receives whether it may be repeated
  bool Part(Program& part, bool& repeats, int depth) {
    if (Take("(")) {
      if (IsNext('?') && !Take("?:")) {
        return Fail("looking around and names of groups are not supported");
      }
      return Alternatives(part, depth + 1) && (Take(")") || Fail("a \"(\" without a \")\""));
    }
    if (Take("[")) {
      return Class(part);
    }
    if (Take("^") || Take("$")) {
      repeats = false;
      part.push_back({*(rest_.data() - 1) == '^' ? Step::kBegin : Step::kEnd});
      return true;
    }
    if (Take(".")) {
      PutSet(without({{'\n', '\n'}, {'\r', '\r'}, {0x2028, 0x2029}}), part);
      return true;
    }
    if (Take("\\b") || Take("\\B")) {
      repeats = false;
      part.push_back({*(rest_.data() - 1) == 'b' ? Step::kWordEdge : Step::kNoWordEdge});
      return true;
    }
    if (IsNext('*') || IsNext('+') || IsNext('?') || IsNext('{')) {
      return Fail("nothing to repeat");
    }
    Ranges ranges;
    if (!Member(ranges, false)) {
      return false;
    }
    PutSet(std::move(ranges), part);
    return true;
  }

  /// A character, an escape of one, or of a set.
  bool Member(Ranges& ranges, bool inClass) {
    if (rest_.empty()) {
      return Fail("the expression breaks off");
    }
    char32_t point = takePoint(rest_);
    if (point != '\\') {
      ranges = {{point, point}};
      return true;
    }
    if (rest_.empty()) {
      return Fail("nothing behind a backslash");
    }
    point = takePoint(rest_);
    return readSet(point, ranges) || Escape(point, ranges, inClass);
  }

  bool Escape(char32_t letter, Ranges& ranges, bool inClass) {
    constexpr std::string_view kLetters = "tnvfr0b";
    constexpr std::string_view kMeant{"\t\n\v\f\r\0\b", 7};
    const size_t known =
        letter < 128 ? kLetters.find(static_cast<char>(letter)) : std::string::npos;
    char32_t point = letter;
    if (known != std::string::npos && (letter != 'b' || inClass)) {
      point = static_cast<unsigned char>(kMeant[known]);
    } else if (letter == 'x' || letter == 'u') {
      if (!Hex(letter == 'x' ? 2 : 4, point)) {
        return Fail("no hexadecimal digits where they must be");
      }
    } else if (letter < 128 && IsAlphanumeric(static_cast<char>(letter))) {
      return Fail("an escape that is not supported");
    }
    ranges = {{point, point}};
    return true;
  }

  bool Hex(size_t digits, char32_t& point) {
    point = 0;
    if (rest_.size() < digits) {
      return false;
    }
    for (size_t i = 0; i < digits; ++i) {
      const int value = HexValue(rest_[i]);
      if (value < 0) {
        return false;
      }
      point = point << 4 | static_cast<char32_t>(value);
    }
    rest_.remove_prefix(digits);
    return true;
  }

  bool Class(Program& part) {
    const bool isNegated = Take("^");
    Ranges all;
    while (!Take("]")) {
      Ranges first;
      if (!Member(first, true)) {
        return false;
      }
      if (rest_.size() > 1 && rest_[0] == '-' && rest_[1] != ']') {
        Ranges last;
        Take("-");
        if (!Member(last, true)) {
          return false;
        }
        const bool isRange = first.size() == 1 && last.size() == 1 &&
                             first[0].first == first[0].second && last[0].first == last[0].second;
        if (!isRange || last[0].first < first[0].first) {
          return Fail("a range that is none");
        }
        first[0].second = last[0].first;
      }
      std::copy(first.begin(), first.end(), std::back_inserter(all));
    }
    PutSet(isNegated ? without(all) : all, part);
    return true;
  }

  bool Number(unsigned& number) {
    if (rest_.empty() || !IsDigit(rest_.front())) {
      return false;
    }
    for (number = 0; !rest_.empty() && IsDigit(rest_.front()); rest_.remove_prefix(1)) {
      number = std::min(number * 10 + static_cast<unsigned>(rest_.front() - '0'), kMostTimes + 1);
    }
    return true;
  }

  /// How often a part is there: what stands behind it.
  bool Times(Program& part, bool repeats) {
    unsigned least = 1;
    unsigned most = 1;
    if (Take("*")) {
      least = 0;
      most = kAnyTimes;
    } else if (Take("+")) {
      most = kAnyTimes;
    } else if (Take("?")) {
      least = 0;
    } else if (Take("{")) {
      if (!Number(least)) {
        return Fail("no number of repetitions");
      }
      most = least;
      if (Take(",") && !Number(most)) {
        most = kAnyTimes;
      }
      if (!Take("}") || most < least || least > kMostTimes ||
          (most != kAnyTimes && most > kMostTimes)) {
        return Fail("a number of repetitions that is none, or above 1000");
      }
    } else {
      return true;
    }
    Take("?");  // as few as possible: the same texts match
    return repeats ? Repeat(part, least, most) : Fail("nothing to repeat");
  }

  bool Repeat(Program& part, unsigned least, unsigned most) {
    const Program once = part;
    part.clear();
    for (unsigned i = 0; i < least; ++i) {
      append(part, once);
      if (!Fits(part)) {
        return false;
      }
    }
    if (most == kAnyTimes) {
      part.push_back({Step::kEither, 1, lengthOf(once) + 2});
      append(part, once);
      part.push_back({Step::kJump, -(lengthOf(once) + 1)});
      return Fits(part);
    }
    const unsigned optional = most - least;
    const auto unit = static_cast<unsigned>(once.size()) + 1;
    if (optional > Pattern::kMostSteps / unit) {
      return Fail("the expression repeats too much");
    }
    for (unsigned i = 0; i < optional; ++i) {
      part.push_back({Step::kEither, 1, static_cast<int>((optional - i) * unit)});
      append(part, once);
    }
    return Fits(part);
  }

  std::string_view rest_;
  Pattern& pattern_;
  std::string& reason_;
};

bool Pattern::Read(std::string_view expression, Pattern& pattern, std::string& reason) {
  pattern.steps_.clear();
  pattern.sets_.clear();
  return PatternReader(expression, pattern, reason).Read();
}

}  // namespace QELO::Platform
