// Well-behaved; writes down what its process is, by ids and open descriptors, at each stage at
// which code of a library runs. The parameter "record" names the file that gets a line each.
//
// Tests: test_processes.py

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>
#include <webapi/APIPolling.h>
#include <webapi/JsonHelper.h>

#include <string>
#include <vector>

#include "PluginTable.h"

using QELO::APIRequest;
using QELO::APIResponse;

static std::string recordPath;

static Json::Value listOf(const std::vector<unsigned>& numbers) {
  Json::Value list(Json::arrayValue);
  for (const unsigned number : numbers) {
    list.append(number);
  }
  return list;
}

/// Where each open descriptor leads, by its number.
static Json::Value descriptors() {
  Json::Value found(Json::objectValue);
  DIR* directory = opendir("/proc/self/fd");
  while (const dirent* entry = directory != nullptr ? readdir(directory) : nullptr) {
    char target[4096] = {};
    const bool isOther = entry->d_name != std::to_string(dirfd(directory));
    if (isOther && readlinkat(dirfd(directory), entry->d_name, target, sizeof target - 1) > 0) {
      found[entry->d_name] = target;
    }
  }
  if (directory != nullptr) {
    closedir(directory);
  }
  return found;
}

static void look(const char* stage) {
  uid_t user[3] = {};
  gid_t group[3] = {};
  std::vector<unsigned> groups(static_cast<size_t>(getgroups(0, nullptr)));
  getresuid(&user[0], &user[1], &user[2]);
  getresgid(&group[0], &group[1], &group[2]);
  [[maybe_unused]] const int count = getgroups(static_cast<int>(groups.size()), groups.data());
  Json::Value line;
  line["stage"] = stage;
  line["users"] = listOf({user[0], user[1], user[2]});
  line["groups"] = listOf({group[0], group[1], group[2]});
  line["supplementary"] = listOf(groups);
  line["descriptors"] = descriptors();
  const std::string text = QELO::JsonHelper::toString(line) + "\n";
  const int fd = open(recordPath.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
  [[maybe_unused]] const ssize_t written = write(fd, text.data(), text.size());
  close(fd);
}

static int check(APIRequest* request, APIResponse*) {
  recordPath = QELO::JsonHelper::asString(request->GetParam("record"));
  look("before");
  return 1;
}

static void run(APIRequest*, APIResponse* response) {
  look("method");
  response->SetSuccess();
}

static void later(APIRequest*, APIResponse* response) {
  response->SetSuccess();
  response->SetCallbackFunc([](void*) { look("callback"); }, nullptr);
}

static void background(APIRequest* request, APIResponse* response) {
  QELO::APIPolling polling(request);
  const auto work = [](APIRequest*, APIResponse* result, void*) {
    look("task");
    result->SetSuccess();
  };
  if (!polling.Start(response, work, nullptr)) {
    response->SetError(400);
  }
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Looking", 1, "run", run},
                                         {"QELO.Test.Looking", 1, "later", later},
                                         {"QELO.Test.Looking", 1, "background", background},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}

PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  static QELO::_tag_API_CHECK_TABLE table[] = {{"QELO.Test.Looking", 1, "run", check, {}},
                                               {"QELO.Test.Looking", 1, "later", check, {}},
                                               {"QELO.Test.Looking", 1, "background", check, {}},
                                               {nullptr, 0, nullptr, nullptr, {}}};
  return table;
}
