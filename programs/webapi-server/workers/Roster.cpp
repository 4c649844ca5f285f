#include "programs/webapi-server/workers/Roster.h"

#include <signal.h>
#include <sys/wait.h>
#include <syslog.h>

#include <algorithm>
#include <utility>

#include "programs/webapi-server/worker/Remains.h"
#include "programs/webapi-server/workers/Ending.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WorkerHub.cpp";
constexpr unsigned kPartOfOne = 4;  ///< an account has a quarter of all workers at most

/// A worker that ends within a call has crashed, whatever status its method gave. The kernel's
/// timer kills it when the call's time is over.
Ending endingOf(int status, const CallClock& clock, std::chrono::seconds limit) {
  if (WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL && clock.Runs() && clock.Time() >= limit) {
    return Ending::kTimeOut;
  }
  return clock.Runs() ? Ending::kCrash : EndingOf(status);
}

}  // namespace

bool Roster::HasRoomFor(const std::string& key) const {
  const unsigned mostOfOne = std::max(1U, limits_.workers / kPartOfOne);
  const auto known = workersOf_.find(key);
  return workers_.size() < limits_.workers &&
         (known == workersOf_.end() || known->second < mostOfOne);
}

void Roster::Add(pid_t pid, const std::string& key, CallClock clock) {
  clock.KeepFromOthers();
  workers_.emplace(pid, Entry{key, std::move(clock)});
  ++workersOf_[key];
  ++figures_.started;
  ++figures_.now;
}

bool Roster::TakeEnded(pid_t pid, int status) {
  const auto worker = workers_.find(pid);
  if (worker == workers_.end()) {
    return false;
  }
  CountEnding(figures_, endingOf(status, worker->second.clock, limits_.call));
  Tell(pid, worker->second, status);
  const auto count = workersOf_.find(worker->second.key);
  if (--count->second == 0) {
    workersOf_.erase(count);
  }
  workers_.erase(worker);
  return true;
}

void Roster::Tell(pid_t pid, const Entry& worker, int status) {
  const std::string account = worker.key.substr(worker.key.find(' ') + 1);
  if (WIFSIGNALED(status)) {
    WEBAPI_LOG(kSource, "the worker %d of %s ended by signal %d", pid, LogText(account).c_str(),
               WTERMSIG(status));
    kill(-pid, SIGKILL);  // what its call has started
  } else if (const char* left = Remains::TextOf(static_cast<Remains::Left>(
                 WEXITSTATUS(status) - static_cast<int>(Ending::kRemains)))) {
    syslog(LOG_INFO, "%s:%d the worker %d of %s ended: a call has left %s", kSource, __LINE__, pid,
           LogText(account).c_str(), LogText(left).c_str());
  }
}

void Roster::KillAll() const {
  for (const auto& [pid, worker] : workers_) {
    kill(-pid, SIGKILL);
  }
}

}  // namespace QELO
