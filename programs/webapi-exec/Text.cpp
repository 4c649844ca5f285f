#include "programs/webapi-exec/Text.h"

#include <clocale>
#include <cwchar>
#include <cwctype>
#include <string_view>
#include <vector>

namespace QELO::ExecProgram {
namespace {

constexpr char kSubstitute[] = "?";
constexpr std::string_view kRest = "...";
constexpr int kMostMarks = 2;  ///< above and below one letter; more of them reach other lines

/// UTF-8 whatever the user's settings are, as all that this program prints.
class Utf8 {
 public:
  Utf8() : former_(uselocale(locale() != nullptr ? locale() : LC_GLOBAL_LOCALE)) {}
  ~Utf8() { uselocale(former_); }
  Utf8(const Utf8&) = delete;
  Utf8& operator=(const Utf8&) = delete;

 private:
  static locale_t locale() {
    static const locale_t kLocale = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    return kLocale;
  }

  locale_t former_;
};

struct Glyph {
  std::string_view bytes;
  size_t columns;
};

/// Marks of the direction of writing, joiners and fillers without a look of their own.
bool isUnseen(wchar_t c) {
  return c == 0xad || c == 0x61c || (c >= 0x200b && c <= 0x200f) || (c >= 0x2028 && c <= 0x202e) ||
         (c >= 0x2060 && c <= 0x206f) || c == 0xfeff || (c >= 0xe0000 && c <= 0xe0fff);
}

/// The characters of a text with the marks that belong to them, harmful ones replaced.
std::vector<Glyph> glyphsOf(std::string_view text) {
  const Utf8 utf8;
  std::vector<Glyph> glyphs;
  int marks = 0;
  while (!text.empty()) {
    wchar_t c = 0;
    std::mbstate_t state{};
    const size_t result = std::mbrtowc(&c, text.data(), text.size(), &state);
    const bool isCharacter = result != 0 && result <= text.size();
    const size_t length = isCharacter ? result : 1;
    const int width = isCharacter && !isUnseen(c) ? wcwidth(c) : -1;
    const std::string_view bytes = text.substr(0, length);
    text.remove_prefix(length);
    marks = width == 0 ? marks + 1 : 0;
    if (width > 0) {
      glyphs.push_back({bytes, static_cast<size_t>(width)});
    } else if (width < 0) {
      glyphs.push_back({kSubstitute, 1});
    } else if (marks <= kMostMarks && !glyphs.empty()) {
      glyphs.push_back({bytes, 0});
    }
  }
  return glyphs;
}

template <typename Iterator>
size_t sumOf(Iterator begin, Iterator end) {
  size_t columns = 0;
  for (; begin != end; ++begin) {
    columns += begin->columns;
  }
  return columns;
}

/// How many glyphs from `begin` on fit.
template <typename Iterator>
size_t fitting(Iterator begin, Iterator end, size_t columns) {
  size_t count = 0;
  for (; begin != end && begin->columns <= columns; ++begin, ++count) {
    columns -= begin->columns;
  }
  return count;
}

std::string join(const std::vector<Glyph>& glyphs, size_t from, size_t count) {
  std::string text;
  for (size_t i = from; i < from + count; ++i) {
    text += glyphs[i].bytes;
  }
  return text;
}

}  // namespace

std::string harmless(const std::string& text) {
  const std::vector<Glyph> glyphs = glyphsOf(text);
  return join(glyphs, 0, glyphs.size());
}

size_t columnsOf(const std::string& text) {
  const std::vector<Glyph> glyphs = glyphsOf(text);
  return sumOf(glyphs.begin(), glyphs.end());
}

std::string frontOf(const std::string& text, size_t columns) {
  const std::vector<Glyph> glyphs = glyphsOf(text);
  if (sumOf(glyphs.begin(), glyphs.end()) <= columns) {
    return text;
  }
  const std::string_view rest = kRest.substr(0, columns);
  const size_t count = fitting(glyphs.begin(), glyphs.end(), columns - rest.size());
  return join(glyphs, 0, count).append(rest);
}

std::string backOf(const std::string& text, size_t columns) {
  const std::vector<Glyph> glyphs = glyphsOf(text);
  if (sumOf(glyphs.begin(), glyphs.end()) <= columns) {
    return text;
  }
  const std::string_view rest = kRest.substr(0, columns);
  size_t count = fitting(glyphs.rbegin(), glyphs.rend(), columns - rest.size());
  while (count > 0 && glyphs[glyphs.size() - count].columns == 0) {
    --count;  // a mark whose letter did not fit
  }
  return std::string(rest) + join(glyphs, glyphs.size() - count, count);
}

}  // namespace QELO::ExecProgram
