#include "Report.h"

#include <webapi/JsonHelper.h>

#include <algorithm>
#include <cmath>
#include <cstring>

namespace checksum {
namespace {

namespace JsonHelper = QELO::JsonHelper;

/// What opening a file costs, in bytes that could be read instead: so that the time left is right
/// for many small files too.
constexpr double kFileCost = 16 * 1024;
/// No forecast before so many seconds.
constexpr double kForecastAfter = 1;

Json::Value countsOf(uint64_t done, uint64_t total) {
  Json::Value counts(Json::objectValue);
  counts["done"] = static_cast<Json::UInt64>(done);
  // The directory may grow while it is read.
  counts["total"] = static_cast<Json::UInt64>(std::max(done, total));
  return counts;
}

std::string reasonOf(int error) {
  char text[256] = "";
  return strerror_r(error, text, sizeof text);
}

}  // namespace

Report::Report(QELO::APIResponse* response, const std::string& directory)
    : response_(response), data_(Json::objectValue) {
  data_["path"] = JsonHelper::repairUtf8(directory);
  data_["state"] = "counting";
  data_["current"] = "";
  data_["error_count"] = 0;
  data_["errors"] = Json::Value(Json::arrayValue);
  Tell(true);
}

void Report::Found(uint64_t bytes) {
  ++filesFound_;
  bytesFound_ += bytes;
  Tell();
}

void Report::StartReading() {
  readingSince_ = Clock::now();
  data_["state"] = "reading";
  Tell();
}

void Report::Reading(const std::string& name) {
  data_["current"] = JsonHelper::repairUtf8(name);
  Tell();
}

void Report::ReadBytes(uint64_t bytes) {
  bytesDone_ += bytes;
  Tell();
}

void Report::Done(const std::string& name, const std::string& digest) {
  ++filesDone_;
  manifest_.Add(digest, name);
}

void Report::Failed(const std::string& name, int error) {
  Json::Value& errors = data_["errors"];
  if (errors.size() < kMostErrors) {
    Json::Value entry(Json::objectValue);
    entry["path"] = JsonHelper::repairUtf8(name);
    entry["reason"] = reasonOf(error);
    errors.append(entry);
  }
  ++errorCount_;
  Tell();
}

void Report::Finish() {
  data_["state"] = "done";
  data_["current"] = "";
  data_["manifest"] = manifest_.Text();
  data_["manifest_complete"] = manifest_.IsComplete();
  bytesFound_ = bytesDone_;
  filesFound_ = filesDone_;
  Tell(true);
}

Json::Value Report::SecondsLeft() const {
  const std::chrono::duration<double> spent = Clock::now() - readingSince_;
  const double done = static_cast<double>(bytesDone_) + kFileCost * static_cast<double>(filesDone_);
  const double total =
      static_cast<double>(bytesFound_) + kFileCost * static_cast<double>(filesFound_);
  if (readingSince_ == Clock::time_point() || spent.count() < kForecastAfter || done <= 0) {
    return Json::Value();
  }
  return static_cast<Json::Int64>(std::ceil(spent.count() * std::max(0.0, total - done) / done));
}

void Report::Tell(bool now) {
  const Clock::time_point time = Clock::now();
  if (!now && time - told_ < kPause) {
    return;
  }
  told_ = time;
  data_["files"] = countsOf(filesDone_, filesFound_);
  data_["bytes"] = countsOf(bytesDone_, bytesFound_);
  data_["error_count"] = static_cast<Json::UInt64>(errorCount_);
  data_["seconds_left"] = SecondsLeft();
  response_->SetSuccess(data_);
}

}  // namespace checksum
