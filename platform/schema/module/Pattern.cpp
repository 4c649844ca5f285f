#include "platform/schema/module/Pattern.h"

#include <algorithm>

#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr char32_t kNothing = 0xFFFFFFFF;  ///< before the text and behind it
constexpr char32_t kForeignByte = 0x110000;

bool isWord(char32_t point) {
  return point == U'_' || (point < 128 && IsAlphanumeric(static_cast<char>(point)));
}

/// Which steps the text may stand at, each once.
class Places {
 public:
  explicit Places(size_t count) : isIn_(count, false) {}

  bool Add(size_t step) {
    if (isIn_[step]) {
      return false;
    }
    isIn_[step] = true;
    steps_.push_back(step);
    return true;
  }
  void Clear() {
    for (const size_t step : steps_) {
      isIn_[step] = false;
    }
    steps_.clear();
  }
  const std::vector<size_t>& Steps() const { return steps_; }
  void Swap(Places& other) {
    isIn_.swap(other.isIn_);
    steps_.swap(other.steps_);
  }

 private:
  std::vector<bool> isIn_;
  std::vector<size_t> steps_;
};

bool holdsHere(Pattern::Step::Kind kind, char32_t before, char32_t after) {
  switch (kind) {
    case Pattern::Step::kBegin:
      return before == kNothing;
    case Pattern::Step::kEnd:
      return after == kNothing;
    case Pattern::Step::kWordEdge:
      return isWord(before) != isWord(after);
    case Pattern::Step::kNoWordEdge:
      return isWord(before) == isWord(after);
    default:
      return true;
  }
}

/// Follows all that takes no character. @return whether the expression's end is among it
bool follow(const std::vector<Pattern::Step>& steps, Places& places, size_t from, char32_t before,
            char32_t after) {
  std::vector<size_t> open{from};
  while (!open.empty()) {
    const size_t at = open.back();
    open.pop_back();
    if (!places.Add(at)) {
      continue;
    }
    const Pattern::Step& step = steps[at];
    if (step.kind == Pattern::Step::kFound) {
      return true;
    }
    if (step.kind == Pattern::Step::kOneOf || !holdsHere(step.kind, before, after)) {
      continue;
    }
    open.push_back(at + static_cast<size_t>(step.first));
    if (step.kind == Pattern::Step::kEither) {
      open.push_back(at + static_cast<size_t>(step.second));
    }
  }
  return false;
}

}  // namespace

char32_t takePoint(std::string_view& text) {
  const auto byte = [&](size_t i) { return static_cast<unsigned char>(text[i]); };
  const unsigned char lead = byte(0);
  const size_t length = lead < 0x80 ? 1 : lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
  char32_t point = length == 1 ? lead : lead & (0x7FU >> length);
  bool isGood = lead < 0x80 || (lead >= 0xC2 && lead < 0xF5 && length <= text.size());
  for (size_t i = 1; isGood && i < length; ++i) {
    isGood = (byte(i) & 0xC0U) == 0x80;
    point = point << 6 | (byte(i) & 0x3FU);
  }
  text.remove_prefix(isGood ? length : 1);
  return isGood ? point : kForeignByte + lead;
}

bool Pattern::Holds(int set, char32_t point) const {
  const Ranges& ranges = sets_[static_cast<size_t>(set)];
  return std::any_of(ranges.begin(), ranges.end(), [point](const Range& range) {
    return point >= range.first && point <= range.second;
  });
}

bool Pattern::IsIn(std::string_view text, size_t& work) const {
  Places now(steps_.size());
  Places next(steps_.size());
  char32_t before = kNothing;
  std::string_view ahead = text;
  char32_t after = ahead.empty() ? kNothing : takePoint(ahead);
  if (follow(steps_, now, 0, before, after)) {
    return true;
  }
  while (after != kNothing) {
    const size_t cost = now.Steps().size() + 1;
    if (work < cost) {
      work = 0;
      return false;
    }
    work -= cost;
    const char32_t point = after;
    after = ahead.empty() ? kNothing : takePoint(ahead);
    next.Clear();
    for (const size_t at : now.Steps()) {
      if (steps_[at].kind == Step::kOneOf && Holds(steps_[at].first, point) &&
          follow(steps_, next, at + 1, point, after)) {
        return true;
      }
    }
    if (follow(steps_, next, 0, point, after)) {  // it may begin anywhere
      return true;
    }
    now.Swap(next);
  }
  return false;
}

}  // namespace QELO::Platform
