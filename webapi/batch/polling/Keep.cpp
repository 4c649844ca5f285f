// Whether a task's record goes with the end of its work.

#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/platform/Task.h"

namespace QELO {
namespace {

constexpr char kRemoveWithEnd[] = "auto_remove";

}  // namespace

bool APIPollingPrivate::Keep(const std::string& fullId) {
  const std::unique_ptr<ARDO::Task> task = FindTask(fullId);
  if (task == nullptr) {
    return false;
  }
  if (!task->getBoolProperty(kRemoveWithEnd, false)) {
    return Fail(POLLING_ERR_UNKNOWN);
  }
  return task->setProperty(kRemoveWithEnd, false) || Fail(POLLING_ERR_NOT_STORED);
}

bool APIPollingPrivate::Release(const std::string& fullId) {
  const std::unique_ptr<ARDO::Task> task = FindTask(fullId);
  if (task == nullptr) {
    return false;
  }
  bool done = task->isFinished();
  if (!done) {
    done = task->setProperty(kRemoveWithEnd, true);
    task->reload();  // it may have ended before it saw that
  }
  if (task->isFinished()) {
    done = task->remove();
  }
  return done || Fail(POLLING_ERR_NOT_STORED);
}

}  // namespace QELO
