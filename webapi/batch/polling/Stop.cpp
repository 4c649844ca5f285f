// The end of a task that somebody asks for.

#include <errno.h>

#include <cstring>

#include "webapi/base/Log.h"
#include "webapi/batch/polling/APIPollingPrivate.h"
#include "webapi/batch/polling/HeldProcess.h"
#include "webapi/batch/polling/Terms.h"
#include "webapi/platform/Task.h"

namespace QELO {

bool APIPollingPrivate::DoKill(pid_t pid, const std::function<bool()>& isStill) const {
  if (pid < 1) {
    WEBAPI_LOG(kPollingSource, "invalid process id");
    return false;
  }
  const HeldProcess process(pid);
  if (isStill && !isStill()) {
    return true;
  }
  const int error = process.Terminate();
  if (error == 0 || error == ESRCH) {
    return true;
  }
  WEBAPI_LOG(kPollingSource, "Failed to kill %d, reason=%s(%d)", pid, strerror(error), error);
  return false;
}

bool APIPollingPrivate::EndProcess(const ARDO::Task& task, const std::string& fullId) {
  const int pid = task.getCreatePid();
  if (pid > 0 && !DoKill(pid, [&] { return task.getCreatePid() == pid; })) {
    WEBAPI_LOG(kPollingSource, "send SIGTERM to task id[%s] fail", LogText(fullId).c_str());
    return Fail(POLLING_ERR_NOT_SIGNALLED);
  }
  return true;
}

bool APIPollingPrivate::Stop(const std::string& fullId, bool remove) {
  if (!HasRequest()) {
    return false;
  }
  std::string owner;
  std::string taskId;
  if (!GetUserAndTaskID(fullId, owner, taskId)) {
    WEBAPI_LOG(kPollingSource, "Invalid task id[%s]", LogText(fullId).c_str());
    return Fail(POLLING_ERR_BAD_PARAMETERS);
  }
  if (!CheckTaskUser(owner)) {
    return Fail(POLLING_ERR_INVALID_ID);
  }
  bool busy = false;
  const std::unique_ptr<ARDO::Task> task = LoadTask(owner, taskId, busy);
  if (task == nullptr) {
    return FailUnread(fullId, busy);
  }
  const bool mayRecordItself = task->getCreatePid() == 0 && !task->isFinished();
  if (!EndProcess(*task, fullId)) {
    return false;
  }
  // A process that records itself now finds the end, and ends; or it did before that was stored,
  // and is found here.
  if (mayRecordItself && task->finish(false) && task->reload() && !EndProcess(*task, fullId)) {
    return false;
  }
  if (!task->finish(remove)) {
    WEBAPI_LOG(kPollingSource, "set task id[%s] to finish fail", LogText(fullId).c_str());
    return Fail(POLLING_ERR_NOT_STORED);
  }
  return true;
}

}  // namespace QELO
