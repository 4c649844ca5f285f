#include "programs/webapi-exec/follow/Follow.h"

#include <cstdio>

#include "programs/webapi-exec/Answer.h"
#include "programs/webapi-exec/Call.h"
#include "programs/webapi-exec/Program.h"
#include "programs/webapi-exec/follow/EndSignals.h"
#include "programs/webapi-exec/follow/Follower.h"
#include "webapi/JsonHelper.h"

namespace QELO::ExecProgram {
namespace {

/// Starts the task.
/// @param id  receives its full id, "" when there is none
/// @return kDone, or kFailed when the call was not made or did not succeed
ExitCode start(const Options& options, std::string& id) {
  EndSignals::keepFirst();
  Json::Value answer;
  const std::string wrong = makeCall(options, answer);
  if (!wrong.empty()) {
    fprintf(stderr, "%s: %s\n", programName, wrong.c_str());
  }
  if (answer.isNull()) {
    return kFailed;
  }
  id = JsonHelper::asString(JsonHelper::member(JsonHelper::member(answer, "data"), "task_id"));
  if (!id.empty()) {
    return kDone;
  }
  if (showAnswer(options, answer) == kDone) {
    fprintf(stderr, "%s: --follow needs a method that starts a task; this one did not\n",
            programName);
  }
  return kFailed;
}

}  // namespace

ExitCode follow(const Options& options) {
  std::string user;
  const std::string wrong = findUser(options, user);
  if (!wrong.empty()) {
    fprintf(stderr, "%s: %s\n", programName, wrong.c_str());
    return kFailed;
  }
  std::string id = options.task;
  if (id.empty() && start(options, id) != kDone) {
    return kFailed;
  }
  return Follower(user, id, !options.user.empty()).Run();
}

}  // namespace QELO::ExecProgram
