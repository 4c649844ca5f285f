#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "platform/settings/KeyValueFile.h"
#include "webapi/base/Pace.h"

namespace QELO::Platform {

/// The platform's settings: /etc/qeloinfo.conf, and for a key that is not there
/// /etc.defaults/qeloinfo.conf.
///
/// A process keeps what it read of a file until the file changes: one request asks for settings a
/// dozen times. Each object sees one state of the first file.
class Settings {
 public:
  Settings();

  std::string Get(std::string_view key, const char* fallback) const;
  /// The fallback also when the value is no whole decimal number or out of range.
  int GetNumber(std::string_view key, int fallback, int lowest, int highest) const;
  /// "yes" and "no" in any case; the fallback for all else.
  bool GetSwitch(std::string_view key, bool fallback) const;

  /// Idle time-out of login sessions in seconds.
  int SessionTimeout() const { return GetNumber("session_timeout", 900, 1, 366 * 86400); }
  /// How many entries a compound request may have.
  int CompoundEntries(bool loggedIn) const {
    return loggedIn ? GetNumber("compound_entries", 1024, 0, 1'000'000)
                    : GetNumber("compound_entries_anonymous", 256, 0, 1'000'000);
  }
  bool TokenEnabled() const { return GetSwitch("enable_token", true); }
  /// How slowly a body may come.
  PaceLimits BodyPace() const;
  /// How slowly a download may be taken. Who plays a film stops reading for minutes.
  PaceLimits DownloadPace() const;

 private:
  PaceLimits PaceOver(int window) const;

  std::shared_ptr<const KeyValueFile> own_;
};

/// What a file of keys and values holds: of the settings' own file, what the process knows of it.
std::shared_ptr<const KeyValueFile> readKeyValueFile(const char* path);

}  // namespace QELO::Platform
