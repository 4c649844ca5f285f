#include "programs/webapi-exec/follow/TaskWatcher.h"

#include <errno.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include "programs/webapi-exec/follow/EndSignals.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/TextFile.h"
#include "webapi/platform/Core.h"

namespace QELO::ExecProgram {
namespace {

constexpr int kLongestWait = 5;                     ///< seconds until a parent that died is noticed
constexpr useconds_t kPauseMicroseconds = 100'000;  ///< people see no more
constexpr char kGoneText[] = "gone";

/// Each change of the task as a line of JSON; an empty line when there was none.
[[noreturn]] void tellChanges(const FollowedTask& task, int descriptor) noexcept {
  EndSignals::leaveToParent();
  signal(SIGPIPE, SIG_IGN);
  std::string state;
  for (bool goesOn = true; goesOn; usleep(kPauseMicroseconds)) {
    Json::Value status;
    std::string line;
    if (task.Wait(state, state.empty() ? 0 : kLongestWait, status) != 0) {
      line = kGoneText;
      goesOn = false;
    } else if (const std::string now = JsonHelper::asString(status["state"]); now != state) {
      state = now;
      status.removeMember("info");
      line = JsonHelper::toString(status);
      goesOn = !JsonHelper::asBool(status["finish"]);
    }
    goesOn = WriteText(descriptor, line + "\n") && goesOn;
  }
  _exit(0);
}

}  // namespace

TaskWatcher::~TaskWatcher() {
  if (process_ > 0) {
    kill(process_, SIGKILL);
    TEMP_FAILURE_RETRY(waitpid(process_, nullptr, 0));
  }
  if (descriptor_ >= 0) {
    close(descriptor_);
  }
}

bool TaskWatcher::Start(const FollowedTask& task) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  process_ = QLIBCProcFork();
  if (process_ == 0) {
    close(ends[0]);
    tellChanges(task, ends[1]);
  }
  close(ends[1]);
  descriptor_ = ends[0];
  return process_ > 0 && fcntl(descriptor_, F_SETFL, O_NONBLOCK) == 0;
}

TaskWatcher::News TaskWatcher::Read(Json::Value& status) {
  News news = News::kNone;
  char chunk[65536];
  ssize_t count = 0;
  while ((count = TEMP_FAILURE_RETRY(read(descriptor_, chunk, sizeof chunk))) > 0) {
    received_.append(chunk, static_cast<size_t>(count));
  }
  const bool isOver = count == 0 || errno != EAGAIN;
  for (size_t end = 0; (end = received_.find('\n')) != std::string::npos;) {
    const News line = ReadLine(received_.substr(0, end), status);
    received_.erase(0, end + 1);
    if (line != News::kNone) {
      news = line;
    }
  }
  return isOver && news == News::kNone ? News::kLost : news;
}

TaskWatcher::News TaskWatcher::ReadLine(const std::string& line, Json::Value& status) const {
  if (line == kGoneText) {
    return News::kGone;
  }
  return JsonHelper::fromString(line, status) ? News::kStatus : News::kNone;
}

}  // namespace QELO::ExecProgram
