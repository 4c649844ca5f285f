#include "webapi/runner/counter/UsageCounter.h"

#include <ctime>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/ReplaceFile.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"

namespace QELO {
namespace {

constexpr int kExclusiveLock = 1;
constexpr int kLockSeconds = 2;
constexpr int kFamilyComponents = 4;

/// The API name's first four components.
std::string family(const std::string& api) {
  size_t dot = api.find('.');
  for (int component = 1; component < kFamilyComponents && dot != std::string::npos; ++component) {
    dot = api.find('.', dot + 1);
  }
  return api.substr(0, dot);
}

void countIn(Json::Value& counters, const std::string& name) {
  Json::Value& counter = counters[name];
  if (counter.isObject()) {
    const int64_t count = JsonHelper::asInt64(JsonHelper::member(counter, "count"));
    counter["count"] = Json::Int64(count == INT64_MAX ? count : count + 1);
    return;
  }
  counter = Json::Value(Json::objectValue);
  counter["count"] = 1;
  counter["ctime"] = Json::Int64(time(nullptr));
}

bool isWanted() {
  return QLIBCFileCheckKeyValue(Paths::kSystemInfo, "enable_data_collect", "yes", 0) != 0;
}

void count(const APIRequest& request) {
  UsageCounter(Paths::kCounterDir)
      .Increase(request.GetAPIClass(), request.GetAPIMethod(), request.GetAPIVersion());
}

}  // namespace

bool UsageCounter::PrepareDirectory() {
  if (!ready_) {
    if (QELOFSMkdirP(directory_.c_str(), 0, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
                     0600) != 0) {
      return false;
    }
    QLIBCFileTouch((directory_ + "/.timestamp").c_str());
    ready_ = true;
  }
  return true;
}

bool UsageCounter::Increase(const std::string& api, const std::string& method, int version) {
  if (!PrepareDirectory()) {
    return false;
  }
  const std::string path = directory_ + "/" + family(api) + ".json";
  int lock = -1;
  if (QLIBCFileLockTimeByFile((path + ".lock").c_str(), kExclusiveLock, kLockSeconds, &lock) < 0) {
    return false;
  }
  Json::Value counters;
  if (!JsonHelper::fromFile(path, counters) || !counters.isObject()) {
    counters = Json::Value(Json::objectValue);
  }
  countIn(counters, api + "_" + std::to_string(version) + "_" + method);
  const bool written = ReplaceFile(path, JsonHelper::toString(counters), {.freshSuffix = ".new"});
  QLIBCFileUnlockByFile(lock);
  return written;
}

void UsageCounter::Count(const APIRequest& request) {
  // The switch is read once a process, which serves one request.
  static const bool enabled = isWanted();
  if (enabled) {
    count(request);
  }
}

void UsageCounter::CountInResident(const APIRequest& request) {
  if (isWanted()) {
    count(request);
  }
}

}  // namespace QELO
