#pragma once

#include <json/json.h>

#include <string>

#include "programs/webapi-exec/Options.h"
#include "programs/webapi-exec/follow/FollowedTask.h"
#include "programs/webapi-exec/follow/Progress.h"
#include "programs/webapi-exec/follow/ProgressScreen.h"
#include "programs/webapi-exec/follow/StopPrompt.h"
#include "programs/webapi-exec/follow/TaskWatcher.h"

namespace QELO::ExecProgram {

/// Follows one task until it ends or is left to itself.
class Follower {
 public:
  /// @param user  login user as whom the task is seen
  /// @param id    the task's full id
  /// @param isUserGiven  the user is named where the task's command line is told
  Follower(const std::string& user, const std::string& id, bool isUserGiven);
  ExitCode Run();

 private:
  /// @return kStatus when the task ended; kNone when it is left, with the signal in signal_
  TaskWatcher::News Watch();
  void WaitForEvents(bool& hasNews, bool& hasAnswer);
  /// @return how the watching ended, or kNone
  TaskWatcher::News TakeNews();
  /// @return false when the task is to be left
  bool TakeSignal();
  bool TakeAnswer();
  void StopTask();
  ExitCode End();
  ExitCode EndGone();
  ExitCode Leave(ExitCode code);

  FollowedTask task_;
  std::string userOption_;
  ProgressScreen screen_;
  StopPrompt prompt_;
  TaskWatcher watcher_;
  Json::Value status_;
  Progress progress_;
  int signal_ = 0;
  bool isStopped_ = false;  ///< by us
};

}  // namespace QELO::ExecProgram
