#include "programs/webapi-server/workers/WorkerMessage.h"

#include <unistd.h>

#include <string_view>

#include "webapi/JsonHelper.h"
#include "webapi/base/Number.h"

namespace QELO::WorkerMessage {

std::string Call(APIRequest& request, APIResponse& response) {
  Json::Value environment(Json::arrayValue);
  for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
    environment.append(*entry);
  }
  Json::Value message(Json::objectValue);
  message[kEnvironment].swap(environment);
  // Borrowed, since a copy of them would cost as much as all the rest.
  message[DaemonMessage::kRequest].swap(request.Serialize());
  message[DaemonMessage::kResponse].swap(response.Serialize());
  std::string text = JsonHelper::toString(message);
  message[DaemonMessage::kRequest].swap(request.Serialize());
  message[DaemonMessage::kResponse].swap(response.Serialize());
  return text;
}

std::string KeyOf(int priority, const std::string& account) {
  return std::to_string(priority) + " " + account;
}

bool ReadKey(const std::string& key, int& priority, std::string& account) {
  const size_t space = key.find(' ');
  if (space == std::string::npos ||
      !ParseNumber(std::string_view(key).substr(0, space), priority)) {
    return false;
  }
  account = key.substr(space + 1);
  return !account.empty();
}

}  // namespace QELO::WorkerMessage
