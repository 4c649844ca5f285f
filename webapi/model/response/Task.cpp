// A response within a background task: each result it is given is the task's at once.

#include <unistd.h>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/model/response/APIResponsePrivate.h"
#include "webapi/platform/Task.h"

namespace QELO {

APIResponsePrivate::~APIResponsePrivate() = default;

void APIResponsePrivate::PrepareTask() {
  if (task_ != nullptr && taskProcess_ != getpid()) {
    // A process that the task forked may be a task of its own, so it must not write into its
    // parent's. A handle keeps nothing but memory, of which a fork has its own copy: deleting it
    // here takes nothing from the parent.
    task_.reset();
  }
  if (task_ == nullptr && request_ != nullptr && request_->IsPollingTask()) {
    task_ = std::make_unique<ARDO::Task>(JsonHelper::asString(request_->GetEnv("task_user")),
                                         JsonHelper::asString(request_->GetEnv("task_id")));
    taskProcess_ = getpid();
  }
}

void APIResponsePrivate::UpdateTask() {
  // The handle alone decides: a method may replace the request's environment, and whoever polls
  // must see its later results all the same.
  if (task_ == nullptr) {
    return;
  }
  task_->beginUpdate();
  task_->setProperty("body", store_["body"]);
  task_->setProperty("task_run", true);
  // One that was removed is no failure: nobody wants its results.
  lacksResult_ = !task_->endUpdate() && task_->reload();
}

}  // namespace QELO
