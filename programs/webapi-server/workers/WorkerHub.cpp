#include "programs/webapi-server/workers/WorkerHub.h"

#include <signal.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <string_view>
#include <utility>

#include "programs/server/Server.h"
#include "programs/webapi-server/front/Front.h"
#include "programs/webapi-server/worker/Worker.h"
#include "programs/webapi-server/workers/CallClock.h"
#include "programs/webapi-server/workers/Ending.h"
#include "programs/webapi-server/workers/RequestLines.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WorkerHub.cpp";
/// Most requests that wait for a front, and how long each does: a front is done in a millisecond.
constexpr size_t kMostWaiting = 128;
constexpr std::chrono::milliseconds kTurn{20};
constexpr std::chrono::milliseconds kStartPause{
    200};  ///< between two fronts that take others' place
/// For one request: whatever holds a front up, it is not needed by those that come after.
constexpr std::chrono::seconds kFrontLimit{30};

}  // namespace

WorkerHub::WorkerHub(Server& server, const WorkerLimits& limits, Metrics& metrics, int argc,
                     char** argv)
    : server_(server),
      limits_(limits),
      metrics_(metrics),
      argc_(argc),
      argv_(argv),
      workers_(limits, metrics.workers) {}

WorkerHub::~WorkerHub() = default;

bool WorkerHub::Open() {
  calls_.Read();
  for (unsigned i = 0; i < limits_.fronts; ++i) {
    if (!StartFront()) {
      return false;
    }
  }
  return true;
}

/// For a process that is forked.
void WorkerHub::ForgetRequests() {
  for (const Held& connection : waiting_) {
    connection->Forget();
  }
  for (const auto& [channel, front] : fronts_) {
    if (front.connection != nullptr) {
      front.connection->Forget();
    }
  }
}

bool WorkerHub::StartFront() {
  UniqueFd ours;
  UniqueFd theirs;
  if (!ControlChannel::Make(ours, theirs) || !server_.Watch(ours.Get())) {
    return false;
  }
  Front front;
  front.pid = server_.Spawn(std::move(theirs), [this](UniqueFd channel) {
    ForgetRequests();
    return QELO::Front(std::move(channel), limits_, argc_, argv_).Run();
  });
  if (front.pid < 0) {
    WEBAPI_LOG(kSource, "cannot start a front [%m]");
    server_.Unwatch(ours.Get());
    return false;
  }
  front.channel = std::move(ours);
  const int channel = front.channel.Get();
  fronts_.emplace(channel, std::move(front));
  ++metrics_.fronts.started;
  ++metrics_.fronts.now;
  return true;
}

WorkerHub::Front* WorkerHub::IdleFront() {
  for (auto& [channel, front] : fronts_) {
    if (front.pid != 0 && !front.isLast && front.connection == nullptr) {
      return &front;
    }
  }
  return nullptr;
}

/// Whether a request may be a worker's call, and is here as a whole.
bool WorkerHub::IsFit(const Connection& connection) const {
  if (connection.header.size() > ControlChannel::kLongest - 1) {
    return false;
  }
  const RequestLines lines(connection.header);
  int here = 0;
  if (lines.bodyLength < 0 || lines.bodyLength > RequestLines::kLongestBody ||
      (lines.bodyLength > 0 &&
       (ioctl(connection.socket.Get(), FIONREAD, &here) != 0 || here < lines.bodyLength))) {
    return false;
  }
  if (lines.IsBarred(lines.query)) {
    return false;
  }
  if (lines.bodyLength == 0) {
    return calls_.MayName(lines.query);
  }
  RequestLines::Body body(connection.socket.Get(), lines.bodyLength);
  return !lines.IsBarred(body.Text()) &&
         (calls_.MayName(lines.query) || calls_.MayName(body.Text()));
}

bool WorkerHub::Give(Front& front, Held& connection) {
  if (!ControlChannel::Send(front.channel.Get(), ControlChannel::kRequest, connection->header,
                            connection->socket.Get(), false)) {
    return false;
  }
  front.connection = std::move(connection);
  front.since = ServerClock::now();
  return true;
}

bool WorkerHub::TakeOver(std::unique_ptr<Connection>& connection) {
  if (isStopping_) {
    return false;
  }
  calls_.Refresh();
  if (!IsFit(*connection)) {
    return false;
  }
  Front* front = waiting_.empty() ? IdleFront() : nullptr;
  if (front != nullptr) {
    return Give(*front, connection);
  }
  if (waiting_.size() >= kMostWaiting) {
    return false;
  }
  connection->deadline = ServerClock::now() + kTurn;
  waiting_.push_back(std::move(connection));
  return true;
}

void WorkerHub::GiveWaiting() {
  while (!waiting_.empty()) {
    Front* front = IdleFront();
    if (front == nullptr) {
      return;
    }
    Held connection = std::move(waiting_.front());
    waiting_.pop_front();
    if (!Give(*front, connection)) {
      server_.ServeApart(std::move(connection));
    }
  }
}

bool WorkerHub::Hear(int descriptor) {
  const auto found = fronts_.find(descriptor);
  if (found == fronts_.end()) {
    return false;
  }
  ControlChannel::Message word;
  if (ControlChannel::Receive(descriptor, word, false)) {
    TakeWord(found->second, word);
    GiveWaiting();
  } else if (errno != EAGAIN) {  // the front and all that it has forked have ended
    server_.Unwatch(descriptor);
    found->second.isLast = true;
    if (found->second.pid == 0) {
      fronts_.erase(found);
    }
  }
  return true;
}

void WorkerHub::TakeWord(Front& front, ControlChannel::Message& word) {
  switch (word.kind) {
    case ControlChannel::kWantWorker:
      StartWorker(front, word.text);
      return;
    case ControlChannel::kDoneLast:
      front.isLast = true;
      [[fallthrough]];
    case ControlChannel::kDone:
      if (front.connection != nullptr) {
        server_.CountServed(*front.connection);
        ++metrics_.byFronts;
      }
      front.connection.reset();
      return;
    case ControlChannel::kLeftLast:
      front.isLast = true;
      [[fallthrough]];
    case ControlChannel::kLeft:
      if (front.connection != nullptr) {
        server_.ServeApart(std::move(front.connection));
      }
      return;
    default:
      return;
  }
}

void WorkerHub::StartWorker(Front& front, const std::string& key) {
  int ends[2] = {-1, -1};
  pid_t pid = -1;
  CallClock clock;
  if (workers_.HasRoomFor(key) && socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) == 0) {
    pid = server_.Spawn(UniqueFd(ends[1]), [&](UniqueFd socket) {
      ForgetRequests();
      return Worker(std::move(socket), key, std::move(clock), limits_, argc_, argv_).Run();
    });
  }
  const UniqueFd theirs(ends[0]);
  if (pid > 0) {
    workers_.Add(pid, key, std::move(clock));
  }
  ControlChannel::Send(front.channel.Get(),
                       pid > 0 ? ControlChannel::kWorker : ControlChannel::kNoWorker, "",
                       pid > 0 ? theirs.Get() : -1, false);
}

void WorkerHub::Ended(pid_t pid, int status) {
  if (workers_.TakeEnded(pid, status)) {
    return;
  }
  for (auto it = fronts_.begin(); it != fronts_.end(); ++it) {
    Front& front = it->second;
    if (front.pid != pid) {
      continue;
    }
    for (ControlChannel::Message word; ControlChannel::Receive(it->first, word, false);) {
      TakeWord(front, word);  // its last ones
    }
    const bool isGone = errno == 0;
    if (front.connection != nullptr) {
      ++metrics_.crashed;
      WEBAPI_LOG(kSource, "the front %d ended within a request, status %d", pid, status);
      shutdown(front.connection->socket.Get(), SHUT_RDWR);
      front.connection.reset();
    }
    front.pid = 0;
    front.isLast = true;
    CountEnding(metrics_.fronts, EndingOf(status));
    if (isGone) {
      server_.Unwatch(it->first);
      fronts_.erase(it);
    }
    return;
  }
}

void WorkerHub::Sweep(ServerClock::time_point now) {
  unsigned alive = 0;
  for (auto& [channel, front] : fronts_) {
    alive += front.pid != 0 ? 1 : 0;
    if (front.pid != 0 && front.connection != nullptr && front.since + kFrontLimit <= now) {
      kill(front.pid, SIGKILL);
    }
  }
  if (!isStopping_ && alive < limits_.fronts && now >= nextStart_) {
    nextStart_ = now + kStartPause;
    StartFront();
  }
  GiveWaiting();
  while (!waiting_.empty() && (waiting_.front()->deadline <= now || isStopping_)) {
    Held connection = std::move(waiting_.front());
    waiting_.pop_front();
    server_.ServeApart(std::move(connection));
  }
}

std::chrono::milliseconds WorkerHub::Patience() const {
  return waiting_.empty() ? std::chrono::milliseconds::max() : kTurn / 2;
}

bool WorkerHub::IsIdle() const {
  const auto has = [this](auto what) {
    return std::any_of(fronts_.begin(), fronts_.end(),
                       [&](const auto& entry) { return what(entry.second); });
  };
  if (isStopping_) {
    return waiting_.empty() && fronts_.empty() && workers_.IsEmpty();
  }
  const auto alive = std::count_if(fronts_.begin(), fronts_.end(),
                                   [](const auto& entry) { return entry.second.pid != 0; });
  return waiting_.empty() && static_cast<unsigned>(alive) >= limits_.fronts &&
         !has([](const Front& front) { return front.connection != nullptr; });
}

/// A front ends when it is idle and told nothing more; its workers, when no front needs them.
void WorkerHub::Stop() {
  isStopping_ = true;
  for (const auto& [channel, front] : fronts_) {
    shutdown(channel, SHUT_WR);
  }
}

void WorkerHub::KillAll() {
  for (const auto& [channel, front] : fronts_) {
    if (front.pid != 0) {
      kill(-front.pid, SIGKILL);
    }
  }
  workers_.KillAll();
}

}  // namespace QELO
