#include "platform/settings/Settings.h"

#include <strings.h>

#include <cstring>

#include "platform/base/KnownFile.h"
#include "platform/base/Paths.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/base/OwnFile.h"
#include "webapi/platform/Core.h"

namespace QELO::Platform {
namespace {

constexpr int kMostRate = 1'000'000'000;  ///< bytes a second
constexpr int kDay = 86400;               ///< seconds
constexpr int kWeek = 7 * kDay;
constexpr int kYear = 366 * kDay;

bool isTrusted(const char* path) {
  if (!OthersMayChange(path)) {
    return true;
  }
  WEBAPI_LOG("Settings.cpp", "refused to read %s: others may write it or its directory",
             LogText(path).c_str());
  return false;
}

/// Empty when others may write it: a setting decides whose word an address is, and what is logged.
class SettingsFile : public KeyValueFile {
 public:
  SettingsFile() = default;
  explicit SettingsFile(const char* path) : KeyValueFile(isTrusted(path) ? path : "") {}
};

std::shared_ptr<const KeyValueFile> defaults() {
  static KnownFile<SettingsFile> file(Paths::kSystemInfoDefaults);
  return file.Get();
}

std::shared_ptr<const KeyValueFile> own() {
  static KnownFile<SettingsFile> file(Paths::kSystemInfo);
  return file.Get();
}

}  // namespace

Settings::Settings() : own_(own()) {}

std::shared_ptr<const KeyValueFile> readKeyValueFile(const char* path) {
  return strcmp(path, Paths::kSystemInfo) == 0 ? own() : std::make_shared<const KeyValueFile>(path);
}

std::string Settings::Get(std::string_view key, const char* fallback) const {
  std::string value;
  return own_->Get(key, value) || defaults()->Get(key, value) ? value : fallback;
}

int Settings::GetNumber(std::string_view key, int fallback, int lowest, int highest) const {
  const std::string text = Get(key, "");
  int number = 0;
  return ParseNumber(text, number) && number >= lowest && number <= highest ? number : fallback;
}

bool Settings::GetSwitch(std::string_view key, bool fallback) const {
  const std::string text = Get(key, "");
  if (strcasecmp(text.c_str(), "yes") == 0) {
    return true;
  }
  return strcasecmp(text.c_str(), "no") == 0 ? false : fallback;
}

PaceLimits Settings::PaceOver(int window) const {
  PaceLimits limits;
  limits.leastRate = static_cast<uint64_t>(GetNumber("transfer_least_rate", 256, 0, kMostRate));
  limits.window = std::chrono::seconds(window);
  limits.longest = std::chrono::seconds(GetNumber("transfer_longest", kWeek, 0, kYear));
  return limits;
}

PaceLimits Settings::BodyPace() const {
  return PaceOver(GetNumber("upload_window", 60, 1, kDay));
}

PaceLimits Settings::DownloadPace() const {
  PaceLimits limits = PaceOver(GetNumber("download_window", 600, 1, kDay));
  limits.idle = limits.window;
  return limits;
}

}  // namespace QELO::Platform

extern "C" int QLIBCConfGetARDOTimeout(void) {
  return QELO::Platform::Settings().SessionTimeout();
}

extern "C" int QLIBCConfGetCompoundEntries(int loggedIn) {
  return QELO::Platform::Settings().CompoundEntries(loggedIn != 0);
}

extern "C" void QLIBCConfGetBodyLimits(QLIBCTransferLimits* limits) {
  const auto secondsOf = [](std::chrono::milliseconds time) {
    return static_cast<unsigned>(std::chrono::duration_cast<std::chrono::seconds>(time).count());
  };
  const QELO::PaceLimits pace = QELO::Platform::Settings().BodyPace();
  *limits = {static_cast<unsigned>(pace.leastRate), secondsOf(pace.window),
             secondsOf(pace.longest)};
}
