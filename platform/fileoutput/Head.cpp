#include "platform/fileoutput/Head.h"

#include <strings.h>

#include <algorithm>

#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

bool startsWith(const std::string& line, std::string_view text) {
  return line.size() >= text.size() && strncasecmp(line.data(), text.data(), text.size()) == 0;
}

}  // namespace

Head::Head(const std::vector<std::string>& lines) {
  for (const std::string& line : lines) {
    const size_t colon = line.find(':');
    if (colon != std::string::npos) {
      Set(line.substr(0, colon), Trim(std::string_view(line).substr(colon + 1)));
    }
  }
}

std::vector<std::string>::const_iterator Head::Find(std::string_view name) const {
  return std::find_if(lines_.begin(), lines_.end(), [name](const std::string& line) {
    return startsWith(line, name) && line.size() > name.size() && line[name.size()] == ':';
  });
}

std::string Head::Get(std::string_view name) const {
  const auto line = Find(name);
  return line == lines_.end() ? "" : std::string(Trim(line->substr(name.size() + 1)));
}

void Head::Set(std::string_view name, std::string_view value) {
  const std::string text = std::string(name) + ": " + std::string(value);
  const auto line = Find(name);
  if (line == lines_.end()) {
    lines_.push_back(text);
  } else {
    lines_[static_cast<size_t>(line - lines_.begin())] = text;
  }
}

void Head::SetDefault(std::string_view name, std::string_view value) {
  if (Find(name) == lines_.end()) {
    Set(name, value);
  }
}

void Head::Remove(std::string_view prefix) {
  std::erase_if(lines_, [prefix](const std::string& line) { return startsWith(line, prefix); });
}

std::string Head::Text() const {
  std::string text;
  for (const std::string& line : lines_) {
    text += line + "\r\n";
  }
  return text + "\r\n";
}

}  // namespace QELO::Platform
