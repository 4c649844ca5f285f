#include "programs/webapi/check/Words.h"

#include <algorithm>
#include <vector>

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {
namespace {

constexpr size_t kLongestWord = 64;   // bytes; nothing that is known is near it
constexpr size_t kLettersForTwo = 6;  // a word of so many may be wrong in two

char lower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

size_t allowance(std::string_view word) {
  return word.size() < kLettersForTwo ? 1 : 2;
}

}  // namespace

size_t Distance(std::string_view one, std::string_view other, size_t most) {
  if (one.size() > kLongestWord || other.size() > kLongestWord) {
    return most + 1;
  }
  const size_t width = other.size() + 1;
  std::vector<size_t> steps((one.size() + 1) * width);
  const auto at = [&](size_t i, size_t j) -> size_t& { return steps[i * width + j]; };
  for (size_t i = 0; i <= one.size(); ++i) {
    for (size_t j = 0; j <= other.size(); ++j) {
      if (i == 0 || j == 0) {
        at(i, j) = i + j;
        continue;
      }
      const size_t change = lower(one[i - 1]) == lower(other[j - 1]) ? 0 : 1;
      at(i, j) = std::min({at(i - 1, j) + 1, at(i, j - 1) + 1, at(i - 1, j - 1) + change});
      const bool isExchanged = i > 1 && j > 1 && lower(one[i - 1]) == lower(other[j - 2]) &&
                               lower(one[i - 2]) == lower(other[j - 1]);
      at(i, j) = isExchanged ? std::min(at(i, j), at(i - 2, j - 2) + 1) : at(i, j);
    }
  }
  return std::min(steps.back(), most + 1);
}

std::string_view Resembling(std::string_view word, const std::vector<std::string_view>& known) {
  std::string_view nearest;
  size_t least = allowance(word) + 1;
  for (const std::string_view candidate : known) {
    const size_t distance = Distance(word, candidate, allowance(word));
    if (distance < least) {
      least = distance;
      nearest = candidate;
    }
  }
  return nearest;
}

std::string Suggestion(std::string_view word, const std::vector<std::string_view>& known) {
  const std::string_view nearest = Resembling(word, known);
  return nearest.empty() ? "" : "; did you mean " + Quoted(nearest) + "?";
}

std::string Quoted(std::string_view name) {
  return "\"" + Shown(std::string(name)) + "\"";
}

}  // namespace QELO::AuthorProgram
