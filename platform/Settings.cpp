#include "platform/Settings.h"

#include <strings.h>
#include <sys/stat.h>

#include <charconv>

#include "platform/PlatformPaths.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {

namespace {

/// A file as this process last read it.
class KnownFile {
 public:
  explicit KnownFile(const char* path) : path_(path) {}

  std::shared_ptr<const KeyValueFile> Get() {
    struct stat now {};
    if (stat(path_, &now) != 0) {
      now = {};
    }
    // A file that is replaced has another inode, one that is written another time or size.
    if (content_ == nullptr || now.st_ino != known_.st_ino || now.st_dev != known_.st_dev ||
        now.st_size != known_.st_size || now.st_mtim.tv_sec != known_.st_mtim.tv_sec ||
        now.st_mtim.tv_nsec != known_.st_mtim.tv_nsec) {
      content_ = std::make_shared<const KeyValueFile>(path_);
      known_ = now;
    }
    return content_;
  }

 private:
  const char* path_;
  struct stat known_ {};
  std::shared_ptr<const KeyValueFile> content_;
};

std::shared_ptr<const KeyValueFile> defaults() {
  static KnownFile file(Paths::kSystemInfoDefaults);
  return file.Get();
}

std::shared_ptr<const KeyValueFile> own() {
  static KnownFile file(Paths::kSystemInfo);
  return file.Get();
}

}  // namespace

Settings::Settings() : own_(own()) {}

std::string Settings::Get(std::string_view key, const char* fallback) const {
  std::string value;
  return own_->Get(key, value) || defaults()->Get(key, value) ? value : fallback;
}

int Settings::GetNumber(std::string_view key, int fallback, int lowest, int highest) const {
  const std::string text = Get(key, "");
  int number = 0;
  const char* end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, number);
  const bool good = result.ec == std::errc() && result.ptr == end;
  return good && number >= lowest && number <= highest ? number : fallback;
}

bool Settings::GetSwitch(std::string_view key, bool fallback) const {
  const std::string text = Get(key, "");
  if (strcasecmp(text.c_str(), "yes") == 0) {
    return true;
  }
  return strcasecmp(text.c_str(), "no") == 0 ? false : fallback;
}

}  // namespace QELO::Platform

extern "C" int QLIBCConfGetARDOTimeout(void) {
  return QELO::Platform::Settings().SessionTimeout();
}
