#include "programs/server/Server.h"

#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

#include "programs/server/OpenFiles.h"
#include "programs/server/ServiceManager.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

using std::chrono::duration_cast;
using std::chrono::microseconds;

constexpr char kSource[] = "Server.cpp";
constexpr rlim_t kOtherFiles = 128;  ///< descriptors that the server has beside its connections
constexpr int kAcceptedAtOnce = 64;  ///< of one listener before the others have their turn
constexpr int kShortageMilliseconds = 10;
constexpr std::chrono::milliseconds kSweepPause{100};
constexpr size_t kReaders = 16;  ///< that ask for the figures at once; no request's room
constexpr std::chrono::seconds kRefusalPause{5};  ///< between two log lines on refusals

bool isGone(int descriptor) {
  pollfd state{descriptor, 0, 0};
  return poll(&state, 1, 0) > 0 && (state.revents & (POLLHUP | POLLERR)) != 0;
}

}  // namespace

Server::Server(Service& service, const ServerLimits& limits, Metrics& metrics)
    : service_(service), limits_(limits), metrics_(metrics), departures_(events_, limits.arriving) {
  metrics_.limits = limits;
  metrics_.startedAt = std::time(nullptr);
}

bool Server::Open() {
  RaiseFileLimit(kOtherFiles + limits_.atOnce + limits_.queued + 2 * limits_.arriving);
  return events_.Open() && signals_.Open() && events_.Watch(signals_.Descriptor());
}

bool Server::Listen(Listener listener) {
  if (!events_.Watch(listener.Descriptor())) {
    return false;
  }
  listeners_.push_back(std::move(listener));
  return true;
}

void Server::StopListening(const std::string& path) {
  for (auto it = listeners_.begin(); it != listeners_.end();) {
    if (it->IsOurs() && it->Path() == path) {
      events_.Unwatch(it->Descriptor());
      it = listeners_.erase(it);
    } else {
      ++it;
    }
  }
}

std::vector<std::string> Server::Paths() const {
  std::vector<std::string> paths;
  for (const Listener& listener : listeners_) {
    paths.push_back(listener.Path());
  }
  return paths;
}

bool Server::IsIdle() const {
  return arriving_.empty() && departures_.IsEmpty() && waiting_.empty() && jobs_.Count() == 0 &&
         (residents_ == nullptr || residents_->IsIdle());
}

void Server::Run() {
  while (!isStopping_ || !IsIdle()) {
    const bool isQuiet = IsIdle() && refused_ == 0;
    const std::chrono::milliseconds pause =
        residents_ != nullptr ? std::min(kSweepPause, residents_->Patience()) : kSweepPause;
    for (const int descriptor : events_.Wait(isQuiet ? Events::kWithoutEnd : pause)) {
      Hear(descriptor);
    }
    Sweep();
  }
}

void Server::Hear(int descriptor) {
  if (descriptor == signals_.Descriptor()) {
    HandleSignals();
    return;
  }
  if (Held connection = TakeArriving(descriptor)) {
    Arrive(std::move(connection));
    return;
  }
  if (departures_.Hear(descriptor)) {
    return;
  }
  for (const Listener& listener : listeners_) {
    if (listener.Descriptor() == descriptor) {
      Accept(listener);
      return;
    }
  }
  if (residents_ != nullptr) {
    residents_->Hear(descriptor);
  }
}

void Server::HandleSignals() {
  for (int number; (number = signals_.Take()) != 0;) {
    if (number == SIGHUP && !isStopping_) {
      service_.Reload(*this);
    } else if ((number == SIGTERM || number == SIGINT) && isStopping_) {
      jobs_.KillAll();
      if (residents_ != nullptr) {
        residents_->KillAll();
      }
    } else if (number == SIGTERM || number == SIGINT) {
      Stop();
    }
  }
  int status = 0;
  const auto tell = [this](pid_t pid, int how) {
    if (residents_ != nullptr) {
      residents_->Ended(pid, how);
    }
  };
  while (auto job = jobs_.TakeEnded(status, tell)) {
    EndJob(std::move(*job), status);
  }
  StartWaiting();
}

void Server::Stop() {
  isStopping_ = true;
  ServiceManager::Tell("STOPPING=1");
  for (const Listener& listener : listeners_) {
    events_.Unwatch(listener.Descriptor());
  }
  // What has connected already was promised an answer.
  for (const Listener& listener : listeners_) {
    while (Accept(listener)) {
    }
  }
  listeners_.clear();
  if (residents_ != nullptr) {
    residents_->Stop();
  }
}

/// @return whether there may be more
bool Server::Accept(const Listener& listener) {
  for (int i = 0; i < kAcceptedAtOnce; ++i) {
    const int accepted = accept4(listener.Descriptor(), nullptr, nullptr, SOCK_CLOEXEC);
    if (accepted < 0) {
      if (errno == EMFILE || errno == ENFILE || errno == ENOMEM) {
        poll(nullptr, 0, kShortageMilliseconds);  // they wait for those that end
      }
      return false;
    }
    auto connection = std::make_unique<Connection>();
    connection->socket = UniqueFd(accepted);
    connection->listener = listener.Path();
    connection->accepted = ServerClock::now();
    connection->deadline = connection->accepted + limits_.arrival;
    if (service_.Admits(*connection)) {
      Arrive(std::move(connection));
    } else {
      ++metrics_.denied;
    }
  }
  return true;
}

void Server::Arrive(Held connection) {
  metrics_.runningNow = jobs_.Count();
  metrics_.waitingNow = waiting_.size();
  metrics_.arrivingNow = arriving_.size() - readers_;
  switch (service_.Take(*connection)) {
    case Service::Arrival::kWhole:
      connection->arrived = ServerClock::now();
      metrics_.arriving.Add(
          duration_cast<microseconds>(connection->arrived - connection->accepted));
      if (residents_ == nullptr || !residents_->TakeOver(connection)) {
        Enqueue(std::move(connection));
      }
      return;
    case Service::Arrival::kAnswered:
      departures_.Tell(std::move(connection));
      return;
    case Service::Arrival::kMalformed:
      Refuse(std::move(connection), Service::Refusal::kMalformed);
      return;
    case Service::Arrival::kTooLarge:
      Refuse(std::move(connection), Service::Refusal::kTooLarge);
      return;
    case Service::Arrival::kMore:
      break;
  }
  const int descriptor = connection->socket.Get();
  const bool isFull =
      connection->isQuiet ? readers_ >= kReaders : arriving_.size() - readers_ >= limits_.arriving;
  if (isFull || !events_.Watch(descriptor)) {
    Refuse(std::move(connection), Service::Refusal::kBusy);
    return;
  }
  readers_ += connection->isQuiet ? 1 : 0;
  arriving_[descriptor] = std::move(connection);
}

/// @return null when nothing arrives by it
Server::Held Server::TakeArriving(int descriptor) {
  const auto found = arriving_.find(descriptor);
  if (found == arriving_.end()) {
    return nullptr;
  }
  events_.Unwatch(descriptor);
  Held connection = std::move(found->second);
  readers_ -= connection->isQuiet ? 1 : 0;
  arriving_.erase(found);
  return connection;
}

void Server::Enqueue(Held connection) {
  if (jobs_.Count() < limits_.atOnce && waiting_.empty()) {
    Start(std::move(connection));
  } else if (waiting_.size() < limits_.queued || DropGone()) {
    connection->deadline = ServerClock::now() + limits_.turn;
    waiting_.push_back(std::move(connection));
  } else {
    Refuse(std::move(connection), Service::Refusal::kBusy);
  }
}

/// Clients that have gone keep nobody out of the queue.
/// @return whether there is room
bool Server::DropGone() {
  std::vector<pollfd> states;
  for (const Held& connection : waiting_) {
    states.push_back({connection->socket.Get(), 0, 0});
  }
  if (poll(states.data(), states.size(), 0) > 0) {
    std::deque<Held> present;
    for (size_t i = 0; i < states.size(); ++i) {
      if ((states[i].revents & (POLLHUP | POLLERR)) == 0) {
        present.push_back(std::move(waiting_[i]));
      }
    }
    metrics_.gone += waiting_.size() - present.size();
    waiting_.swap(present);
  }
  return waiting_.size() < limits_.queued;
}

void Server::StartWaiting() {
  while (!waiting_.empty() && jobs_.Count() < limits_.atOnce) {
    Held connection = std::move(waiting_.front());
    waiting_.pop_front();
    if (isGone(connection->socket.Get())) {
      ++metrics_.gone;
    } else {
      Start(std::move(connection));
    }
  }
}

void Server::Refuse(Held connection, Service::Refusal reason) {
  if (connection->isQuiet) {
    return;
  }
  ++refused_;
  metrics_.CountRefusal(reason);
  connection->Forget();
  connection->answer = service_.Refuse(reason);
  departures_.Tell(std::move(connection));
}

/// What is waited for in vain.
void Server::Sweep() {
  const ServerClock::time_point now = ServerClock::now();
  if (now < nextSweep_) {
    return;
  }
  nextSweep_ = now + kSweepPause;
  jobs_.KillOverdue(now);
  if (residents_ != nullptr) {
    residents_->Sweep(now);
  }
  std::vector<int> slow;
  for (const auto& [descriptor, connection] : arriving_) {
    if (connection->deadline <= now) {
      slow.push_back(descriptor);
    }
  }
  for (const int descriptor : slow) {
    Refuse(TakeArriving(descriptor), Service::Refusal::kSlow);
  }
  departures_.Sweep(now);
  while (!waiting_.empty() && waiting_.front()->deadline <= now) {  // the oldest is the first
    Held connection = std::move(waiting_.front());
    waiting_.pop_front();
    Refuse(std::move(connection), Service::Refusal::kBusy);
  }
  LogRefusals(now);
}

/// One line a while, however many they are.
void Server::LogRefusals(ServerClock::time_point now) {
  if (refused_ > 0 && now >= nextRefusalLine_) {
    nextRefusalLine_ = now + kRefusalPause;
    syslog(LOG_WARNING, "%s:%d refused %u; %zu at work, %zu waiting, %zu arriving", kSource,
           __LINE__, std::exchange(refused_, 0), jobs_.Count(), waiting_.size(), arriving_.size());
  }
}

}  // namespace QELO
