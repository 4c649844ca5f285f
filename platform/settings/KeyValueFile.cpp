#include "platform/settings/KeyValueFile.h"

#include <fcntl.h>

#include <algorithm>

#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr std::string_view kBlanks = " \t\r";

std::string_view trimmed(std::string_view text) {
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
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
  const UniqueFd file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  std::string text;
  if (!file || !readText(file.Get(), kMaxSize, text)) {
    return;
  }
  for (std::string_view rest = text; !rest.empty();) {
    const size_t end = rest.find('\n');
    const std::string_view line = trimmed(rest.substr(0, end));
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
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
