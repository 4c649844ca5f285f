#include "platform/settings/KeyValueFile.h"

#include <algorithm>

#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"

namespace QELO::Platform {
namespace {

constexpr std::string_view kBlanks = " \t\r";
constexpr size_t kLikelyLines = 16;

std::string_view trimmed(std::string_view text) {
  return Trim(text, kBlanks);
}

std::string_view unquoted(std::string_view text) {
  text = trimmed(text);
  if (!text.empty() && (text.front() == '"' || text.front() == '\'')) {
    const size_t end = text.find(text.front(), 1);
    return text.substr(1, end == std::string_view::npos ? end : end - 1);
  }
  for (size_t hash = text.find('#'); hash != std::string_view::npos;
       hash = text.find('#', hash + 1)) {
    if (hash == 0 || kBlanks.find(text[hash - 1]) != std::string_view::npos) {
      return trimmed(text.substr(0, hash));
    }
  }
  return text;
}

}  // namespace

KeyValueFile::KeyValueFile(const char* path) {
  // An administrator may link a configuration file elsewhere, so links are followed here.
  UniqueFd file;
  struct stat info {};
  if (OpenRegularFile(AT_FDCWD, path, file, info, 0) != 0 ||
      !ReadText(file.Get(), kMaxSize, text_)) {
    text_.clear();
    return;
  }
  lines_.reserve(kLikelyLines);
  for (std::string_view rest = text_; !rest.empty();) {
    const std::string_view line = trimmed(TakePiece(rest, "\n"));
    const size_t equals = line.find('=');
    if (equals != std::string_view::npos && line.front() != '#') {
      lines_.emplace_back(trimmed(line.substr(0, equals)), unquoted(line.substr(equals + 1)));
    }
  }
}

bool KeyValueFile::Get(std::string_view key, std::string& value) const {
  const auto last = std::find_if(lines_.rbegin(), lines_.rend(),
                                 [key](const auto& line) { return line.first == key; });
  if (last != lines_.rend()) {
    value = last->second;
  }
  return last != lines_.rend();
}

}  // namespace QELO::Platform
