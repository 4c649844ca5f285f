#pragma once

#include <json/json.h>
#include <sys/types.h>

#include <string>

#include "programs/webapi-exec/follow/FollowedTask.h"

namespace QELO::ExecProgram {

/// Waits for a task's changes in a process of its own, so that this one is free for the terminal.
class TaskWatcher {
 public:
  enum class News { kNone, kStatus, kGone, kLost };

  TaskWatcher() = default;
  TaskWatcher(const TaskWatcher&) = delete;
  TaskWatcher& operator=(const TaskWatcher&) = delete;
  /// Ends the process.
  ~TaskWatcher();

  /// Begins. @return false, with errno, when there can be no process
  bool Start(const FollowedTask& task);
  /// Can be read when there is something for Read().
  int Descriptor() const { return descriptor_; }
  /// What came since the last call; does not wait.
  /// @param status  receives the newest status, for kStatus
  /// @return kGone: there is no such task any more. kLost: the process ended without saying so.
  News Read(Json::Value& status);

 private:
  News ReadLine(const std::string& line, Json::Value& status) const;

  pid_t process_ = -1;
  int descriptor_ = -1;
  std::string received_;
};

}  // namespace QELO::ExecProgram
