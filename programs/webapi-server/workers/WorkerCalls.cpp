#include "programs/webapi-server/workers/WorkerCalls.h"

#include <sys/stat.h>

#include <algorithm>

#include "webapi/APIDescription.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WorkerCalls.cpp";
/// A directory that changed so lately may change again within the same time stamp.
constexpr time_t kSettledSeconds = 2;

/// The text of the last parameter of that name; "" without one.
std::string_view valueOf(std::string_view line, std::string_view name) {
  for (size_t at = line.rfind(name); at != std::string_view::npos;
       at = at == 0 ? std::string_view::npos : line.rfind(name, at - 1)) {
    if (at == 0 || line[at - 1] == '&') {
      const std::string_view value = line.substr(at + name.size());
      return value.substr(0, value.find('&'));
    }
  }
  return {};
}

timespec changeOfDirectory() {
  struct stat info {};
  return stat(".", &info) == 0 ? info.st_mtim : timespec{};
}

bool isKnown(const Json::Value& isolation) {
  return isolation.isNull() || JsonHelper::isText(isolation, "process") ||
         JsonHelper::isText(isolation, "worker");
}

}  // namespace

bool WorkerCalls::Fit(const Json::Value& attributes) {
  constexpr const char* kOthers[] = {"allowUpload", "allowDownload", "deferUpload",
                                     "grantByDefault", "grantable"};
  return APIDescription::SharesProcess(attributes) &&
         std::none_of(std::begin(kOthers), std::end(kOthers),
                      [&](const char* name) { return APIDescription::IsSet(attributes, name); });
}

void WorkerCalls::Read() {
  changed_ = changeOfDirectory();
  read_ = time(nullptr);
  calls_.clear();
  APIRunner runner;
  Json::Value catalogue(Json::objectValue);
  runner.InitLibDesc(catalogue);
  for (auto it = catalogue.begin(); it != catalogue.end(); ++it) {
    Add(it.name(), *it);
  }
}

void WorkerCalls::Add(const std::string& api, const Json::Value& description) {
  const APIDescription described(description);
  for (const int version : described.Versions()) {
    for (const std::string& method : described.Methods(version)) {
      const Json::Value* attributes = described.Attributes(version, method);
      if (attributes == nullptr) {
        continue;
      }
      if (!isKnown(JsonHelper::member(*attributes, "isolation"))) {
        WEBAPI_LOG(kSource, "isolation of %s_%d_%s is neither process nor worker",
                   LogText(api).c_str(), version, LogText(method).c_str());
      } else if (Fit(*attributes)) {
        calls_[api].insert(method);
      }
    }
  }
}

void WorkerCalls::Refresh() {
  const time_t now = time(nullptr);
  if (now == looked_) {
    return;
  }
  looked_ = now;
  const timespec changed = changeOfDirectory();
  const bool isOther = changed.tv_sec != changed_.tv_sec || changed.tv_nsec != changed_.tv_nsec;
  if (isOther || (read_ - changed.tv_sec < kSettledSeconds && now > read_ + 1)) {
    Read();
  }
}

bool WorkerCalls::MayName(std::string_view line) const {
  const std::string_view api = valueOf(line, "api=");
  if (api.empty() || calls_.empty()) {
    return false;
  }
  const auto found = calls_.find(std::string(api));
  return found != calls_.end() && found->second.count(std::string(valueOf(line, "method="))) != 0;
}

}  // namespace QELO
