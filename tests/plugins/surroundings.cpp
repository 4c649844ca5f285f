// Answers which descriptors and variables of the environment it sees.
//
// Tests: test_surroundings.py

#include <dirent.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "PluginTable.h"

static Json::Value descriptors() {
  Json::Value numbers(Json::arrayValue);
  DIR* stream = opendir("/proc/self/fd");
  while (const dirent* entry = stream != nullptr ? readdir(stream) : nullptr) {
    const int number = atoi(entry->d_name);
    char target[4096] = "";
    const std::string path = std::string("/proc/self/fd/") + entry->d_name;
    if (number > 2 && number != dirfd(stream) &&
        readlink(path.c_str(), target, sizeof target - 1) > 0) {
      numbers.append(target);
    }
  }
  if (stream != nullptr) {
    closedir(stream);
  }
  return numbers;
}

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  Json::Value data;
  data["descriptors"] = descriptors();
  data["environment"] = Json::Value(Json::arrayValue);
  for (char** entry = environ; *entry != nullptr; ++entry) {
    data["environment"].append(*entry);
  }
  response->SetSuccess(data);
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Surroundings", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
