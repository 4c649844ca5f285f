// Writing the system information file.

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <string>
#include <string_view>

#include "platform/base/FileLock.h"
#include "platform/base/Paths.h"
#include "platform/settings/KeyValueFile.h"
#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"
#include "webapi/base/ReplaceFile.h"
#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

constexpr int kLockSeconds = 2;
constexpr std::string_view kBlanks = " \t\r";

bool isKey(std::string_view key) {
  return !key.empty() && std::all_of(key.begin(), key.end(), [](char c) {
    return IsAlphanumeric(c) || c == '_' || c == '-' || c == '.';
  });
}

/// The value in quotes, or "" when no line of the file can hold it.
std::string quoted(std::string_view value) {
  const bool hasDouble = value.find('"') != std::string_view::npos;
  const bool hasSingle = value.find('\'') != std::string_view::npos;
  if (value.find('\n') != std::string_view::npos || (hasDouble && hasSingle)) {
    return "";
  }
  const char quote = hasDouble ? '\'' : '"';
  return quote + std::string(value) + quote;
}

/// Where a line's value starts when it sets the key, else npos.
size_t findValue(std::string_view line, std::string_view key) {
  const size_t start = std::min(line.find_first_not_of(kBlanks), line.size());
  if (line.substr(start, key.size()) != key) {
    return std::string_view::npos;
  }
  const size_t equals = line.find_first_not_of(kBlanks, start + key.size());
  return equals != std::string_view::npos && line[equals] == '=' ? equals + 1
                                                                 : std::string_view::npos;
}

/// What stands behind the value when it is a comment.
std::string_view commentBehind(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(kBlanks), text.size()));
  size_t end = 0;
  if (!text.empty() && (text.front() == '"' || text.front() == '\'')) {
    end = std::min(text.find(text.front(), 1), text.size());
  }
  for (size_t hash = text.find('#', end); hash != std::string_view::npos;
       hash = text.find('#', hash + 1)) {
    if (hash == 0 || kBlanks.find(text[hash - 1]) != std::string_view::npos) {
      return text.substr(hash);
    }
  }
  return {};
}

/// The file's text with the key set: in the last line that does, which is the one that counts, or
/// in a new one.
std::string withKey(const std::string& text, const std::string& key, const std::string& value) {
  size_t found = std::string::npos;
  size_t foundEnd = 0;
  std::string_view comment;
  for (size_t start = 0; start < text.size();) {
    const size_t end = std::min(text.find('\n', start), text.size());
    const std::string_view line = std::string_view(text).substr(start, end - start);
    const size_t valueAt = findValue(line, key);
    if (valueAt != std::string_view::npos) {
      found = start;
      foundEnd = end;
      comment = commentBehind(line.substr(valueAt));
    }
    start = end + 1;
  }
  std::string line = key + "=" + value;
  if (found == std::string::npos) {
    return text + (text.empty() || text.back() == '\n' ? "" : "\n") + line + "\n";
  }
  if (!comment.empty()) {
    line += " " + std::string(comment);
  }
  return text.substr(0, found) + line + text.substr(foundEnd);
}

/// The file that a path leads to: an administrator may have linked it elsewhere.
std::string targetOf(const char* path) {
  char target[PATH_MAX];
  return realpath(path, target) != nullptr ? target : path;
}

/// Reads the file, or nothing when there is none.
bool readFile(const std::string& path, std::string& text) {
  UniqueFd file;
  struct stat info {};
  const int error = OpenRegularFile(AT_FDCWD, path.c_str(), file, info);
  return error == 0 ? ReadText(file.Get(), KeyValueFile::kMaxSize, text) : error == ENOENT;
}

bool setKey(const char* name, const std::string& key, const std::string& value) {
  const std::string path = targetOf(name);
  // The file itself is replaced, so its directory is what writers meet at.
  const UniqueFd directory(
      open(path.substr(0, path.rfind('/') + 1).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  std::string text;
  if (OthersMayChange(path)) {  // it does not count
    WEBAPI_LOG("SystemInfo.cpp", "refused to change %s: others may write it or its directory",
               LogText(path).c_str());
    return false;
  }
  if (!directory || !lockFile(directory.Get(), kLockSeconds) || !readFile(path, text)) {
    return false;
  }
  const std::string changed = withKey(text, key, value);
  return changed.size() <= KeyValueFile::kMaxSize &&
         (changed == text ||
          ReplaceFile(path, changed, {.mode = 0644, .keepsOwner = true, .isSynced = true}));
}

}  // namespace
}  // namespace QELO::Platform

extern "C" int QLIBCINFOSetKeyValue(const char* key, const char* value) {
  using namespace QELO::Platform;
  if (key == nullptr || value == nullptr || !isKey(key)) {
    return -1;
  }
  const std::string text = quoted(value);
  return !text.empty() && setKey(QELO::Paths::kSystemInfo, key, text) ? 0 : -1;
}
