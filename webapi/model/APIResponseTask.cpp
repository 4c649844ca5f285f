// A response within a background task: each result it is given is the task's at once.

#include <unistd.h>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/model/APIResponsePrivate.h"
#include "webapi/platform/Task.h"

namespace QELO {

APIResponsePrivate::~APIResponsePrivate() = default;

void APIResponsePrivate::UpdateTask() {
  const std::string user = JsonHelper::asString(request_->GetEnv("task_user"));
  const std::string id = JsonHelper::asString(request_->GetEnv("task_id"));
  if (task_ != nullptr && taskProcess_ != getpid()) {
    // A task that a task started: the handle is its parent's, whose process still uses what it
    // holds open, and must not be closed here.
    static_cast<void>(task_.release());
  }
  if (task_ == nullptr || user != taskUser_ || id != task_->getTaskId()) {
    task_ = std::make_unique<ARDO::Task>(user, id);
    taskUser_ = user;
    taskProcess_ = getpid();
  }
  task_->beginUpdate();
  task_->setProperty("body", store_["body"]);
  task_->setProperty("task_run", true);
  task_->endUpdate();
}

}  // namespace QELO
