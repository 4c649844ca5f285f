#pragma once

#include <sys/types.h>

#include <deque>
#include <functional>
#include <memory>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "programs/server/Connection.h"
#include "programs/server/Departures.h"
#include "programs/server/Events.h"
#include "programs/server/Jobs.h"
#include "programs/server/Limits.h"
#include "programs/server/Listener.h"
#include "programs/server/Service.h"
#include "programs/server/SignalQueue.h"
#include "programs/server/metrics/Metrics.h"
#include "programs/server/processes/Residents.h"

namespace QELO {

/// Accepts connections and has each served by a process of its own, within limits, so that nothing
/// of one request is left for another, and one that crashes, leaks or hangs costs nobody else.
///
/// One thread, which never waits for one connection: a header is taken as it comes, and no process
/// is spent before it is whole. SIGHUP reloads; SIGTERM finishes what has been accepted and stops,
/// a second one kills it.
class Server {
 public:
  /// @param metrics  is kept up to date
  Server(Service& service, const ServerLimits& limits, Metrics& metrics);
  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;

  /// @return false, with errno, when the server cannot be had
  bool Open();
  /// Listens there as well.
  bool Listen(Listener listener);
  /// Listens there no more, unless that socket was handed by somebody else.
  void StopListening(const std::string& path);
  std::vector<std::string> Paths() const;

  /// Has processes that stay take what they can. @param residents  outlive the serving; null: none
  void Use(Residents* residents) { residents_ = residents; }

  /// Serves until it is told to stop.
  void Run();

  /// For residents: what they wait for, beside the server's own. Unwatched before it is closed.
  bool Watch(int descriptor) { return events_.Watch(descriptor); }
  void Unwatch(int descriptor) { events_.Unwatch(descriptor); }
  /// For residents: a request that they took over has been served.
  void CountServed(const Connection& connection);
  /// For residents: a process that has one descriptor beside the standard ones, nothing of the
  /// requests that are here, and ends with what `run` returns.
  /// @param kept  closed in the server, whatever comes of it
  /// @param run   is given the descriptor
  /// @return below 0, with errno: none
  pid_t Spawn(UniqueFd kept, const std::function<int(UniqueFd)>& run);
  /// For residents: has a connection served by a process of its own after all.
  void ServeApart(std::unique_ptr<Connection> connection) { Enqueue(std::move(connection)); }

 private:
  using Held = std::unique_ptr<Connection>;

  void HandleSignals();
  bool Accept(const Listener& listener);
  Held TakeArriving(int descriptor);
  void Arrive(Held connection);
  void Enqueue(Held connection);
  void Start(Held connection);
  bool DropGone();
  void StartWaiting();
  [[noreturn]] void RunChild(Held connection, Note& note);
  void ForgetRequests();
  void Refuse(Held connection, Service::Refusal reason);
  void Hear(int descriptor);
  void EndJob(Jobs::Job job, int status);
  void Sweep();
  void LogRefusals(ServerClock::time_point now);
  void Stop();
  bool IsIdle() const;

  Service& service_;
  Residents* residents_ = nullptr;
  const ServerLimits limits_;
  Metrics& metrics_;
  SignalQueue signals_;
  Events events_;
  Departures departures_;
  std::vector<Listener> listeners_;
  std::unordered_map<int, Held> arriving_;  ///< by descriptor
  size_t readers_ = 0;                      ///< that are among these
  std::deque<Held> waiting_;
  Jobs jobs_;
  ServerClock::time_point nextSweep_;
  ServerClock::time_point nextRefusalLine_;
  unsigned refused_ = 0;  ///< since the last line on it
  bool isStopping_ = false;
};

}  // namespace QELO
