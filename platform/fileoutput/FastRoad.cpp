#include "platform/fileoutput/FastRoad.h"

#include <limits.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <iterator>
#include <string>
#include <string_view>

#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "webapi/base/Hex.h"
#include "webapi/base/Text.h"
#include "webapi/base/Utf8.h"
#include "webapi/platform/FileOutput.h"

namespace QELO::Platform {
namespace {

/// The headers that have a server look at the file's state once more, and by other rules than ours.
constexpr const char* kConditions[] = {
    "HTTP_RANGE",         "HTTP_IF_RANGE",          "HTTP_IF_MATCH",
    "HTTP_IF_NONE_MATCH", "HTTP_IF_MODIFIED_SINCE", "HTTP_IF_UNMODIFIED_SINCE"};

enum class Road { kNone, kSendFile, kRedirect };

Road configuredRoad(const Settings& settings) {
  const std::string name = settings.Get("fast_output", "");
  if (strcasecmp(name.c_str(), "x-sendfile") == 0) {
    return Road::kSendFile;
  }
  return strcasecmp(name.c_str(), "x-accel-redirect") == 0 ? Road::kRedirect : Road::kNone;
}

/// The real path of an open file, "" when it has none any more.
std::string pathOf(const Content& content) {
  char path[PATH_MAX];
  const std::string link = "/proc/self/fd/" + std::to_string(content.Descriptor());
  const ssize_t length = readlink(link.c_str(), path, sizeof path);
  if (length <= 0 || length == static_cast<ssize_t>(sizeof path)) {
    return "";
  }
  const std::string found(path, static_cast<size_t>(length));
  struct stat info {};
  const bool isIt = found.front() == '/' && lstat(found.c_str(), &info) == 0 &&
                    info.st_dev == content.Status().st_dev &&
                    info.st_ino == content.Status().st_ino;
  return isIt && RepairUtf8(found) == found ? found : "";
}

/// The length of the one of the directories that the path is below; 0 when there is none.
size_t findDirectory(const std::string& path, std::string_view directories) {
  while (!directories.empty()) {
    std::string_view directory = Trim(TakePiece(directories, ":"));
    while (directory.ends_with('/')) {
      directory.remove_suffix(1);
    }
    const std::string prefix = std::string(Paths::kRootPrefix) + std::string(directory);
    if (!directory.empty() && path.starts_with(prefix + "/")) {
      return prefix.size();
    }
  }
  return 0;
}

/// Whether everybody who may enter the directory may read the file.
bool isOpenToAll(const std::string& path, size_t directory, const Content& content) {
  if ((content.Status().st_mode & S_IROTH) == 0) {
    return false;
  }
  for (size_t slash = path.rfind('/'); slash > directory; slash = path.rfind('/', slash - 1)) {
    struct stat info {};
    if (stat(path.substr(0, slash).c_str(), &info) != 0 || (info.st_mode & S_IXOTH) == 0) {
      return false;
    }
  }
  return true;
}

/// The path as a part of an address; servers decode it.
std::string encoded(const std::string& path) {
  std::string text;
  for (const char c : path) {
    if (IsAlphanumeric(c) || strchr("/-_.~", c) != nullptr) {
      text += c;
    } else {
      text += '%';
      AppendHex(static_cast<unsigned char>(c), kUpperHex, text);
    }
  }
  return text;
}

}  // namespace

bool FastRoad::isEnabled_ = true;

bool FastRoad::IsEnabled() {
  return isEnabled_ && configuredRoad(Settings()) != Road::kNone;
}

bool FastRoad::Take(const Content& content, Head& head) {
  const auto isSet = [](const char* name) { return *requestText(name) != '\0'; };
  if (!isEnabled_ || !content.IsWholeFile() || content.Length() == 0 || !isMethod("GET") ||
      !isSet("GATEWAY_INTERFACE") ||
      std::any_of(std::begin(kConditions), std::end(kConditions), isSet)) {
    return false;
  }
  const Settings settings;
  const Road road = configuredRoad(settings);
  const std::string path = road == Road::kNone ? "" : pathOf(content);
  const size_t directory = findDirectory(path, settings.Get("fast_output_dirs", ""));
  if (directory == 0 || !isOpenToAll(path, directory, content)) {
    return false;
  }
  if (road == Road::kSendFile) {
    head.Set("X-Sendfile", encoded(path));
  } else {
    head.Set("X-Accel-Redirect",
             settings.Get("fast_output_location", "/webapi-files") + encoded(path));
  }
  return true;
}

}  // namespace QELO::Platform

namespace QELO::HTTP {

void FileOutputerHelper::SetFastOutputEnabled(bool enabled) {
  Platform::FastRoad::SetEnabled(enabled);
}

bool FileOutputerHelper::IsFastOutputEnabled() {
  return Platform::FastRoad::IsEnabled();
}

}  // namespace QELO::HTTP
