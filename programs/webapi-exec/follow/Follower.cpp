#include "programs/webapi-exec/follow/Follower.h"

#include <poll.h>
#include <signal.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "programs/webapi-exec/Answer.h"
#include "programs/webapi-exec/Program.h"
#include "programs/webapi-exec/Text.h"
#include "programs/webapi-exec/follow/EndSignals.h"
#include "webapi/JsonHelper.h"

namespace QELO::ExecProgram {
namespace {

using JsonHelper::asBool;
using JsonHelper::member;
using News = TaskWatcher::News;

constexpr int kTickMs = 250;  ///< between looks at the clock
constexpr int kSignalBase = 128;
constexpr int kWhole = 100;

/// What the work has set last, without what describes the task.
Json::Value bodyOf(Json::Value status) {
  if (status.isObject()) {
    for (const char* name : {"finish", "auto_remove", "info", "state"}) {
      status.removeMember(name);
    }
  }
  return status;
}

bool succeeded(const Json::Value& status) {
  return asBool(member(status, "success"));
}

/// One word for a shell.
std::string quoted(const std::string& word) {
  std::string text = "'";
  for (const char c : word) {
    text += c == '\'' ? std::string("'\\''") : std::string(1, c);
  }
  return text + "'";
}

}  // namespace

Follower::Follower(const std::string& user, const std::string& id, bool isUserGiven)
    : task_(user, id), userOption_(isUserGiven ? " --user " + quoted(user) : "") {}

ExitCode Follower::Run() {
  if (const int error = task_.Look(status_); error != 0) {
    fprintf(stderr, "%s: %s: error %d: %s\n", programName, harmless(task_.Id()).c_str(), error,
            taskErrorText(error));
    return kFailed;
  }
  progress_ = readProgress(status_);
  EndSignals::keepAll();
  task_.Keep();
  screen_.Say("Task " + harmless(task_.Id()));
  News news = News::kLost;
  if (watcher_.Start(task_)) {
    news = Watch();
  }
  switch (news) {
    case News::kStatus:
      return End();
    case News::kGone:
      return EndGone();
    case News::kNone:
      return Leave(signal_ != 0 ? static_cast<ExitCode>(kSignalBase + signal_) : kLeft);
    case News::kLost:
      break;
  }
  fprintf(stderr, "%s: the task cannot be watched any longer\n", programName);
  return Leave(kFailed);
}

TaskWatcher::News Follower::Watch() {
  for (;;) {
    bool hasNews = false;
    bool hasAnswer = false;
    WaitForEvents(hasNews, hasAnswer);
    if (hasNews) {
      if (const News news = TakeNews(); news != News::kNone) {
        return news;
      }
    }
    if (!TakeSignal() || (hasAnswer && !TakeAnswer())) {
      return News::kNone;
    }
    if (!prompt_.IsAsking()) {
      screen_.Show(progress_);
    }
  }
}

void Follower::WaitForEvents(bool& hasNews, bool& hasAnswer) {
  pollfd events[] = {{watcher_.Descriptor(), POLLIN, 0}, {prompt_.Descriptor(), POLLIN, 0}};
  if (poll(events, 2, kTickMs) > 0) {
    hasNews = events[0].revents != 0;
    hasAnswer = events[1].revents != 0;
  }
}

TaskWatcher::News Follower::TakeNews() {
  const News news = watcher_.Read(status_);
  if (member(status_, "data").isObject()) {  // an error leaves how far the work had come
    progress_ = readProgress(status_);
  }
  const bool goesOn = news == News::kStatus && !asBool(member(status_, "finish"));
  return goesOn ? News::kNone : news;
}

bool Follower::TakeSignal() {
  const int caught = EndSignals::take();
  if (caught == 0) {
    return true;
  }
  const bool isAgain = prompt_.IsAsking();
  prompt_.Cancel();
  screen_.EndLine();
  if (caught == SIGINT && !isAgain && screen_.IsTerminal() && ProgressScreen::IsForeground() &&
      prompt_.Ask()) {
    return true;
  }
  signal_ = caught;
  return false;
}

bool Follower::TakeAnswer() {
  switch (prompt_.Read()) {
    case StopPrompt::Choice::kStop:
      StopTask();
      return true;
    case StopPrompt::Choice::kLeave:
      return false;
    case StopPrompt::Choice::kGoOn:
    case StopPrompt::Choice::kNone:
      break;
  }
  return true;
}

void Follower::StopTask() {
  const int error = task_.Stop();
  isStopped_ = error == 0;
  if (error != 0) {
    fprintf(stderr, "%s: error %d: %s\n", programName, error, taskErrorText(error));
  }
}

ExitCode Follower::End() {
  prompt_.Cancel();
  const Json::Value body = bodyOf(status_);
  // A stop leaves the last progress as the result: only what is missing tells of it.
  const bool isWhole =
      !isStopped_ && succeeded(body) && (progress_.percent < 0 || progress_.percent == kWhole);
  if (isWhole) {
    progress_.percent = kWhole;
  }
  screen_.ShowLast(progress_);
  ExitCode code = kFailed;
  if (isWhole || (!isStopped_ && !succeeded(body))) {
    code = showAnswer(body);
  } else {
    printAnswer(body);
    fprintf(stderr, "%s: the task was stopped%s\n", programName,
            isStopped_ ? "" : " before all was done");
  }
  const std::string reason =
      JsonHelper::asString(member(member(member(body, "error"), "errors"), "reason"));
  if (code != kDone && !reason.empty()) {
    fprintf(stderr, "%s: %s\n", programName, harmless(reason).c_str());
  }
  if (fflush(stdout) == 0) {
    task_.Release();
  }
  return code;
}

ExitCode Follower::EndGone() {
  prompt_.Cancel();
  screen_.EndLine();
  printAnswer(bodyOf(status_));
  fprintf(stderr, "%s: the task's record was removed; this is the last that was seen of it\n",
          programName);
  return kFailed;
}

ExitCode Follower::Leave(ExitCode code) {
  task_.Release();
  prompt_.Cancel();
  screen_.EndLine();
  fprintf(stderr, "The task goes on. To follow it again:\n  %s --follow --task %s%s\n", programName,
          quoted(harmless(task_.Id())).c_str(), userOption_.c_str());
  return code;
}

}  // namespace QELO::ExecProgram
