#pragma once

#include <json/json.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

#include "paths/Reason.h"

namespace files {

/// What a copy, move or removal has done, and what it could not do.
class Report {
 public:
  static constexpr std::chrono::milliseconds kPause{200};  ///< between two that are told
  static constexpr unsigned kMostErrors = 100;             ///< described ones; all are counted

  /// Gets what clients see of it, now and then.
  using Listener = std::function<void(const Json::Value&)>;

  /// @param state  what is being done: "copying"
  explicit Report(std::string state) : state_(std::move(state)) {}

  /// From now on it is told how far the work is.
  void TellTo(Listener listener);

  /// Before the work: an item was found that it will come to.
  void Found(uint64_t bytes);
  void StartWork();

  void Doing(const std::string& path);
  void DoneBytes(uint64_t bytes);
  void DoneItem();
  /// One was left as it is, since its name was taken.
  void Skipped();
  void Failed(const std::string& path, Reason reason);
  void Finish();

  uint64_t FailedItems() const { return failed_; }
  Reason FirstReason() const { return firstReason_; }
  Json::Value Json() const;

 private:
  using Clock = std::chrono::steady_clock;

  void Tell(bool now = false);
  Json::Value SecondsLeft() const;

  std::string state_;
  std::string shownState_;
  std::string current_;
  Listener listener_;
  Json::Value errors_{Json::arrayValue};
  uint64_t itemsFound_ = 0;
  uint64_t bytesFound_ = 0;
  uint64_t itemsDone_ = 0;
  uint64_t bytesDone_ = 0;
  uint64_t skipped_ = 0;
  uint64_t failed_ = 0;
  Reason firstReason_ = Reason::kNone;
  Clock::time_point told_;
  Clock::time_point workingSince_;
};

}  // namespace files
