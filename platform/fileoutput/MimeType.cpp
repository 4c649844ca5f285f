// Types of files by their names, as the host's media-types list has them: the one that its web
// servers read, so that a file has one type whoever sends it.

#include <algorithm>
#include <cctype>
#include <string>
#include <string_view>

#include "platform/base/Paths.h"
#include "webapi/base/TextFile.h"
#include "webapi/platform/FileOutput.h"

namespace {

constexpr char kUnknown[] = "application/octet-stream";
constexpr size_t kLargestList = 4 << 20;  ///< bytes; Debian's has 72 KiB
constexpr size_t kLongestEnding = 32;     ///< bytes
constexpr std::string_view kBlanks = " \t";

/// What stands behind the last dot of a name, in small letters; "" for none.
std::string endingOf(std::string_view name) {
  name.remove_prefix(name.rfind('/') + 1);  // npos + 1 is 0
  const size_t dot = name.rfind('.');
  if (dot == std::string_view::npos || dot == 0 || name.size() - dot - 1 > kLongestEnding) {
    return "";
  }
  std::string ending(name.substr(dot + 1));
  const auto isOther = [](char c) { return c <= ' ' || c >= '\x7f' || c == '#'; };
  if (std::any_of(ending.begin(), ending.end(), isOther)) {
    return "";
  }
  std::transform(ending.begin(), ending.end(), ending.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
  return ending;
}

/// The type at the start of the line in which `ending` is a word, and not the first.
std::string_view findType(std::string_view list, const std::string& ending) {
  const auto isEnd = [](char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; };
  for (size_t at = list.find(ending); at != std::string_view::npos;
       at = list.find(ending, at + 1)) {
    const size_t after = at + ending.size();
    if (at == 0 || kBlanks.find(list[at - 1]) == std::string_view::npos ||
        (after < list.size() && !isEnd(list[after]))) {
      continue;
    }
    const size_t before = list.rfind('\n', at);
    const size_t start = before == std::string_view::npos ? 0 : before + 1;
    const std::string_view type = list.substr(start, list.find_first_of(kBlanks, start) - start);
    const bool isComment = list.substr(start, at - start).find('#') != std::string_view::npos;
    if (!isComment && type.find('/') != std::string_view::npos) {
      return type;
    }
  }
  return kUnknown;
}

}  // namespace

std::string HTTPFileOutputer::GetMimeType(const std::string& name) {
  const std::string ending = endingOf(name);
  QELO::UniqueFd file;
  struct stat info {};
  std::string list;
  if (ending.empty() ||
      QELO::OpenRegularFile(AT_FDCWD, QELO::Paths::kMimeTypes, file, info, 0) != 0 ||
      !QELO::ReadText(file.Get(), kLargestList, list)) {
    return kUnknown;
  }
  return std::string(findType(list, ending));
}
