#include "programs/server/Server.h"

#include <poll.h>
#include <sys/epoll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <utility>

#include "programs/server/OpenFiles.h"
#include "programs/server/ServiceManager.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "Server.cpp";
constexpr rlim_t kOtherFiles = 128;  ///< descriptors that the server has beside its connections
constexpr int kEventsAtOnce = 64;
constexpr int kAcceptedAtOnce = 64;  ///< of one listener before the others have their turn
constexpr int kShortageMilliseconds = 10;
constexpr std::chrono::milliseconds kSweepPause{100};
constexpr std::chrono::seconds kLeavingLimit{2};  ///< for who was refused to take that in
constexpr std::chrono::seconds kRefusalPause{5};  ///< between two log lines on refusals
constexpr size_t kDropped = 65536;                ///< bytes that are dropped by one read

bool isGone(int descriptor) {
  pollfd state{descriptor, 0, 0};
  return poll(&state, 1, 0) > 0 && (state.revents & (POLLHUP | POLLERR)) != 0;
}

}  // namespace

Server::Server(Service& service, const ServerLimits& limits) : service_(service), limits_(limits) {}

bool Server::Open() {
  RaiseFileLimit(kOtherFiles + limits_.atOnce + limits_.queued + 2 * limits_.arriving);
  events_ = UniqueFd(epoll_create1(EPOLL_CLOEXEC));
  return events_ && signals_.Open() && Watch(signals_.Descriptor());
}

bool Server::Watch(int descriptor) {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.fd = descriptor;
  return epoll_ctl(events_.Get(), EPOLL_CTL_ADD, descriptor, &event) == 0;
}

/// Always before it is closed: a child may have it open, and then the kernel goes on to report it.
void Server::Unwatch(int descriptor) {
  epoll_ctl(events_.Get(), EPOLL_CTL_DEL, descriptor, nullptr);
}

bool Server::Listen(Listener listener) {
  if (!Watch(listener.Descriptor())) {
    return false;
  }
  listeners_.push_back(std::move(listener));
  return true;
}

void Server::StopListening(const std::string& path) {
  for (auto it = listeners_.begin(); it != listeners_.end();) {
    if (it->IsOurs() && it->Path() == path) {
      Unwatch(it->Descriptor());
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
  return arriving_.empty() && leaving_.empty() && waiting_.empty() && jobs_.Count() == 0;
}

void Server::Run() {
  epoll_event events[kEventsAtOnce];
  while (!isStopping_ || !IsIdle()) {
    const int pause = IsIdle() && refused_ == 0 ? -1 : static_cast<int>(kSweepPause.count());
    const int count = epoll_wait(events_.Get(), events, kEventsAtOnce, pause);
    for (int i = 0; i < count; ++i) {
      Hear(events[i].data.fd);
    }
    Sweep();
  }
}

void Server::Hear(int descriptor) {
  if (descriptor == signals_.Descriptor()) {
    HandleSignals();
    return;
  }
  const auto arriving = arriving_.find(descriptor);
  if (arriving != arriving_.end()) {
    Unwatch(descriptor);
    Held connection = std::move(arriving->second);
    arriving_.erase(arriving);
    Arrive(std::move(connection));
    return;
  }
  const auto leaving = leaving_.find(descriptor);
  if (leaving != leaving_.end()) {
    char dropped[kDropped];
    const ssize_t count = recv(descriptor, dropped, sizeof dropped, MSG_DONTWAIT);
    if (count == 0 || (count < 0 && errno != EAGAIN && errno != EINTR)) {
      Unwatch(descriptor);
      leaving_.erase(leaving);
    }
    return;
  }
  for (const Listener& listener : listeners_) {
    if (listener.Descriptor() == descriptor) {
      Accept(listener);
      return;
    }
  }
}

void Server::HandleSignals() {
  for (int number; (number = signals_.Take()) != 0;) {
    if (number == SIGHUP && !isStopping_) {
      service_.Reload(*this);
    } else if ((number == SIGTERM || number == SIGINT) && isStopping_) {
      jobs_.KillAll();
    } else if (number == SIGTERM || number == SIGINT) {
      Stop();
    }
  }
  int status = 0;
  while (auto job = jobs_.TakeEnded(status)) {
    EndJob(std::move(*job), status);
  }
  StartWaiting();
}

void Server::Stop() {
  isStopping_ = true;
  ServiceManager::Tell("STOPPING=1");
  for (const Listener& listener : listeners_) {
    Unwatch(listener.Descriptor());
  }
  // What has connected already was promised an answer.
  for (const Listener& listener : listeners_) {
    while (Accept(listener)) {
    }
  }
  listeners_.clear();
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
    }
  }
  return true;
}

void Server::Arrive(Held connection) {
  switch (service_.Take(*connection)) {
    case Service::Arrival::kWhole:
      Enqueue(std::move(connection));
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
  if (arriving_.size() >= limits_.arriving || !Watch(descriptor)) {
    Refuse(std::move(connection), Service::Refusal::kBusy);
    return;
  }
  arriving_[descriptor] = std::move(connection);
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
    waiting_.swap(present);
  }
  return waiting_.size() < limits_.queued;
}

void Server::StartWaiting() {
  while (!waiting_.empty() && jobs_.Count() < limits_.atOnce) {
    Held connection = std::move(waiting_.front());
    waiting_.pop_front();
    if (!isGone(connection->socket.Get())) {
      Start(std::move(connection));
    }
  }
}

void Server::Start(Held connection) {
  Jobs::Job job;
  job.note = Jobs::MakeNote();
  std::fflush(nullptr);
  job.pid = job.note == nullptr ? -1 : fork();
  if (job.pid < 0) {
    WEBAPI_LOG(kSource, "cannot start a process [%m]");
    Refuse(std::move(connection), Service::Refusal::kBusy);
    return;
  }
  if (job.pid == 0) {
    RunChild(std::move(connection), *job.note);
  }
  job.started = ServerClock::now();
  job.deadline = job.started + limits_.request;
  job.connection = std::move(connection);
  job.connection->header = std::string();
  jobs_.Add(std::move(job));
}

void Server::RunChild(Held connection, Note& note) {
  setsid();
  SignalQueue::Reset();
  KeepAlone(connection->socket);
  const int status = service_.Serve(*connection, note);
  std::fflush(nullptr);
  _exit(status);
}

void Server::EndJob(Jobs::Job job, int status) {
  using std::chrono::duration_cast;
  using std::chrono::microseconds;
  const int descriptor = job.connection->socket.Get();
  service_.Ended(*job.note, {job.pid, status, job.isKilled,
                             duration_cast<microseconds>(job.started - job.connection->accepted),
                             duration_cast<microseconds>(ServerClock::now() - job.started)});
  if (job.isSilent) {
    Refuse(std::move(job.connection), Service::Refusal::kTimedOut);
    return;
  }
  shutdown(descriptor, SHUT_RDWR);  // whoever else may hold it: the answer ends here
}

void Server::Refuse(Held connection, Service::Refusal reason) {
  ++refused_;
  const int descriptor = connection->socket.Get();
  const std::string text = service_.Refuse(reason);
  send(descriptor, text.data(), text.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
  shutdown(descriptor, SHUT_WR);
  // Closed with something unread, the other side might lose what it was told.
  if (!text.empty() && leaving_.size() < limits_.arriving && Watch(descriptor)) {
    connection->deadline = ServerClock::now() + kLeavingLimit;
    leaving_[descriptor] = std::move(connection);
  }
}

/// What is waited for in vain.
void Server::Sweep() {
  const ServerClock::time_point now = ServerClock::now();
  if (now < nextSweep_) {
    return;
  }
  nextSweep_ = now + kSweepPause;
  jobs_.KillOverdue(now);
  for (auto it = arriving_.begin(); it != arriving_.end();) {
    Held connection = it->second->deadline <= now ? std::move(it->second) : nullptr;
    if (connection == nullptr) {
      ++it;
      continue;
    }
    it = arriving_.erase(it);
    Unwatch(connection->socket.Get());
    Refuse(std::move(connection), Service::Refusal::kSlow);
  }
  for (auto it = leaving_.begin(); it != leaving_.end();) {
    if (it->second->deadline > now) {
      ++it;
      continue;
    }
    Unwatch(it->first);
    it = leaving_.erase(it);
  }
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
