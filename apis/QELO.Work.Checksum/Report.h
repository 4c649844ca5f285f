#pragma once

#include <webapi/APIResponse.h>

#include <chrono>
#include <cstdint>
#include <string>

#include "Manifest.h"

namespace checksum {

/// What a client sees of the work: tells the response how far it is, not too often.
class Report {
 public:
  static constexpr std::chrono::milliseconds kPause{200};  ///< between two updates
  static constexpr unsigned kMostErrors = 100;             ///< described ones; all are counted

  Report(QELO::APIResponse* response, const std::string& directory);

  /// A file was found that will be read.
  void Found(uint64_t bytes);
  /// All were found.
  void StartReading();
  void Reading(const std::string& name);
  void ReadBytes(uint64_t bytes);
  /// The file read last is done.
  void Done(const std::string& name, const std::string& digest);
  void Failed(const std::string& name, int error);
  /// The result.
  void Finish();

 private:
  using Clock = std::chrono::steady_clock;

  void Tell(bool now = false);
  Json::Value SecondsLeft() const;

  QELO::APIResponse* response_;
  Json::Value data_;
  Manifest manifest_;
  uint64_t filesFound_ = 0;
  uint64_t bytesFound_ = 0;
  uint64_t filesDone_ = 0;
  uint64_t bytesDone_ = 0;
  uint64_t errorCount_ = 0;
  Clock::time_point told_;
  Clock::time_point readingSince_;
};

}  // namespace checksum
