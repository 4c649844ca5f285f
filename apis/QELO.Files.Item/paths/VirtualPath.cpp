#include "paths/VirtualPath.h"

#include <webapi/JsonHelper.h>

#include <algorithm>

namespace files {
namespace {

/// Whether a text may be a part of a path to something that is there.
bool isPart(const std::string& name) {
  return !name.empty() && name.size() <= VirtualPath::kLongestName && name != "." && name != ".." &&
         name.find('/') == std::string::npos && name.find('\0') == std::string::npos;
}

bool isControl(char c) {
  return static_cast<unsigned char>(c) < 0x20 || c == 0x7F;
}

}  // namespace

bool isTemporaryName(const std::string& name) {
  return name.starts_with(kTemporaryPrefix);
}

bool isNewName(const std::string& name) {
  return isPart(name) && std::none_of(name.begin(), name.end(), isControl) &&
         QELO::JsonHelper::repairUtf8(name) == name && !isTemporaryName(name);
}

Reason VirtualPath::Parse(const std::string& text, VirtualPath& path) {
  if (text.empty() || text.size() > kLongest || text[0] != '/') {
    return Reason::kBadPath;
  }
  VirtualPath parsed;
  for (size_t begin = 1; begin < text.size();) {
    const size_t end = std::min(text.find('/', begin), text.size());
    std::string part = text.substr(begin, end - begin);
    if (!isPart(part) || isTemporaryName(part)) {
      return Reason::kBadPath;
    }
    if (parsed.parts_.size() == kDeepest) {
      return Reason::kTooDeep;
    }
    parsed.parts_.push_back(std::move(part));
    begin = end + 1;
  }
  path = std::move(parsed);
  return Reason::kNone;
}

std::string VirtualPath::Below() const {
  std::string below;
  for (size_t i = 1; i < parts_.size(); ++i) {
    below += (i == 1 ? "" : "/") + parts_[i];
  }
  return below.empty() ? "." : below;
}

VirtualPath VirtualPath::Parent() const {
  VirtualPath parent = *this;
  if (!parent.parts_.empty()) {
    parent.parts_.pop_back();
  }
  return parent;
}

VirtualPath VirtualPath::Child(const std::string& name) const {
  VirtualPath child = *this;
  child.parts_.push_back(name);
  return child;
}

std::string VirtualPath::Text() const {
  std::string text;
  for (const std::string& part : parts_) {
    text += "/" + part;
  }
  return text.empty() ? "/" : text;
}

bool VirtualPath::IsWithin(const VirtualPath& folder) const {
  return parts_.size() >= folder.parts_.size() &&
         std::equal(folder.parts_.begin(), folder.parts_.end(), parts_.begin());
}

}  // namespace files
