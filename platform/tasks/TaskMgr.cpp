#include <unistd.h>

#include <algorithm>
#include <vector>

#include "platform/tasks/Access.h"
#include "platform/tasks/Id.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Task.h"

using namespace QELO::Platform;

namespace ARDO {

namespace {

/// @param incomplete  receives whether a store that is waited for was busy
Json::Value listTasks(const std::string& owner, const char* prefix, bool unended,
                      bool& incomplete) {
  Json::Value ids(Json::arrayValue);
  std::vector<ListedTask> tasks;
  incomplete = false;
  TaskStores* stores = openTaskStores();
  if (stores == nullptr) {
    return ids;
  }
  for (const uid_t store : stores->Stores()) {
    const Standing standing = standingOf(store, owner);
    if (standing == Standing::kNothing) {
      continue;
    }
    const TaskResult result = stores->List(
        {store, owner, prefix != nullptr ? prefix : "", unended, patienceWith(standing)}, tasks);
    incomplete = incomplete || (result == TaskResult::kBusy && standing == Standing::kOwn);
  }
  const auto isOlder = [](const ListedTask& left, const ListedTask& right) {
    return left.created < right.created;
  };
  if (!std::is_sorted(tasks.begin(), tasks.end(), isOlder)) {  // one store's are
    std::stable_sort(tasks.begin(), tasks.end(), isOlder);
  }
  for (const ListedTask& task : tasks) {
    ids.append(task.id);
  }
  return ids;
}

}  // namespace

TaskMgr::TaskMgr(const std::string& owner) : owner_(owner) {}

Json::Value TaskMgr::getAllTaskId(const char* prefix) {
  return listTasks(owner_, prefix, false, isIncomplete_);
}

Json::Value TaskMgr::getUnendedTaskId(const char* prefix) {
  return listTasks(owner_, prefix, true, isIncomplete_);
}

std::string TaskUtil::getUniqueID(const std::string&, const std::string& prefix) {
  if (!isTaskPrefix(prefix)) {
    WEBAPI_LOG("TaskMgr.cpp",
               "a task id's prefix holds up to %zu letters, digits, '.', '_' and '-'",
               kTaskPrefixLength);
    return "";
  }
  return makeTaskId(prefix, geteuid());
}

bool TaskUtil::checkTaskExists(const std::string& owner, const std::string& taskId) {
  return Task(owner, taskId).reload();
}

}  // namespace ARDO
