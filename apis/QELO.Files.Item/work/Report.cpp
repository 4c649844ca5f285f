#include "work/Report.h"

#include <webapi/JsonHelper.h>

#include <algorithm>
#include <cmath>

namespace files {
namespace {

/// What an item costs beside its bytes, in bytes that could be copied instead, so that the time
/// left is right for many small files too.
constexpr double kItemCost = 16 * 1024;
/// No forecast before so many seconds.
constexpr double kForecastAfter = 1;

Json::Value countsOf(uint64_t done, uint64_t total) {
  Json::Value counts(Json::objectValue);
  counts["done"] = Json::UInt64{done};
  counts["total"] = Json::UInt64{std::max(done, total)};  // more may come while it is at work
  return counts;
}

}  // namespace

void Report::TellTo(Listener listener) {
  listener_ = std::move(listener);
  shownState_ = "counting";
  Tell(true);
}

void Report::Found(uint64_t bytes) {
  ++itemsFound_;
  bytesFound_ += bytes;
  Tell();
}

void Report::StartWork() {
  shownState_ = state_;
  workingSince_ = Clock::now();
  Tell();
}

void Report::Doing(const std::string& path) {
  current_ = path;
  Tell();
}

void Report::DoneBytes(uint64_t bytes) {
  bytesDone_ += bytes;
  Tell();
}

void Report::DoneItem() {
  ++itemsDone_;
  Tell();
}

void Report::Skipped() {
  ++skipped_;
  DoneItem();
}

void Report::Failed(const std::string& path, Reason reason) {
  if (errors_.size() < kMostErrors) {
    Json::Value error(Json::objectValue);
    error["path"] = QELO::JsonHelper::repairUtf8(path);
    error["reason"] = wordOf(reason);
    errors_.append(error);
  }
  if (failed_++ == 0) {
    firstReason_ = reason;
  }
  Tell();
}

void Report::Finish() {
  shownState_ = "done";
  current_.clear();
}

Json::Value Report::SecondsLeft() const {
  const std::chrono::duration<double> spent = Clock::now() - workingSince_;
  const double done = static_cast<double>(bytesDone_) + kItemCost * static_cast<double>(itemsDone_);
  const double total =
      static_cast<double>(bytesFound_) + kItemCost * static_cast<double>(itemsFound_);
  if (workingSince_ == Clock::time_point() || spent.count() < kForecastAfter || done <= 0) {
    return Json::Value();
  }
  return Json::Int64{std::llround(std::ceil(spent.count() * std::max(0.0, total - done) / done))};
}

Json::Value Report::Json() const {
  Json::Value data(Json::objectValue);
  data["state"] = shownState_;
  data["current"] = QELO::JsonHelper::repairUtf8(current_);
  data["items"] = countsOf(itemsDone_, itemsFound_);
  data["bytes"] = countsOf(bytesDone_, bytesFound_);
  data["skipped"] = Json::UInt64{skipped_};
  data["error_count"] = Json::UInt64{failed_};
  data["errors"] = errors_;
  data["seconds_left"] = SecondsLeft();
  return data;
}

void Report::Tell(bool now) {
  const Clock::time_point time = Clock::now();
  if (listener_ == nullptr || (!now && time - told_ < kPause)) {
    return;
  }
  told_ = time;
  listener_(Json());
}

}  // namespace files
