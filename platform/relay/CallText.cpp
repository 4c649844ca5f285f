#include "platform/relay/CallText.h"

#include <algorithm>
#include <iterator>

#include "webapi/JsonHelper.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::Platform {
namespace {

/// What the call itself says, and credentials; an upload's companion names ask for nothing here.
constexpr const char* kLeftOut[] = {"api", "version",     "method",      "_sid",
                                    "tid", "_sharing_id", "_sharing_sid"};

bool isLeftOut(const std::string& name) {
  return std::any_of(std::begin(kLeftOut), std::end(kLeftOut),
                     [&](const char* other) { return name == other; });
}

}  // namespace

bool writeCall(const std::string& api, int version, const std::string& method,
               const Json::Value& params, size_t limit, std::string& line) {
  const auto add = [&line](const std::string& name, const Json::Value& value) {
    line += line.empty() ? "" : "&";
    line += WebAPIUtil::URLEncode(name) + "=" + WebAPIUtil::URLEncode(JsonHelper::toString(value));
  };
  line.clear();
  add("api", api);
  add("version", version);
  add("method", method);
  if (params.isObject()) {
    for (auto it = params.begin(); it != params.end() && line.size() <= limit; ++it) {
      if (!isLeftOut(it.name())) {
        add(it.name(), *it);
      }
    }
  }
  return line.size() <= limit;
}

}  // namespace QELO::Platform
