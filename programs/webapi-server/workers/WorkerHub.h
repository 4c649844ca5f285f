#pragma once

#include <sys/types.h>

#include <deque>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "programs/server/Connection.h"
#include "programs/server/metrics/Metrics.h"
#include "programs/server/processes/Residents.h"
#include "programs/webapi-server/workers/ControlChannel.h"
#include "programs/webapi-server/workers/Roster.h"
#include "programs/webapi-server/workers/WorkerCalls.h"
#include "programs/webapi-server/workers/WorkerLimits.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {

class Server;

/// The server's side of processes that stay. It hands requests that may be workers' calls to fronts
/// that have nothing to do, and starts workers for them. It never waits: a request that no front
/// takes soon goes the way of all others.
class WorkerHub : public Residents {
 public:
  /// @param metrics     is kept up to date
  /// @param argc, argv  main()'s, whose area shows the call that a process makes
  WorkerHub(Server& server, const WorkerLimits& limits, Metrics& metrics, int argc, char** argv);
  ~WorkerHub() override;

  /// Starts the fronts. @return false, with errno, when they cannot be had
  bool Open();
  /// Reads anew which calls are workers'.
  void Reload() { calls_.Read(); }

  bool TakeOver(std::unique_ptr<Connection>& connection) override;
  bool Hear(int descriptor) override;
  void Ended(pid_t pid, int status) override;
  void Sweep(ServerClock::time_point now) override;
  std::chrono::milliseconds Patience() const override;
  bool IsIdle() const override;
  void Stop() override;
  void KillAll() override;

 private:
  using Held = std::unique_ptr<Connection>;
  struct Front {
    pid_t pid = 0;  ///< 0: it has ended; processes of its own may still use the channel
    UniqueFd channel;
    Held connection;                ///< that it serves
    bool isLast = false;            ///< it takes no more
    ServerClock::time_point since;  ///< it has had the connection
  };

  bool StartFront();
  Front* IdleFront();
  bool Give(Front& front, Held& connection);
  bool IsFit(const Connection& connection) const;
  void GiveWaiting();
  void TakeWord(Front& front, ControlChannel::Message& word);
  void StartWorker(Front& front, const std::string& key);
  void ForgetRequests();

  Server& server_;
  const WorkerLimits limits_;
  Metrics& metrics_;
  const int argc_;
  char** const argv_;
  WorkerCalls calls_;
  std::unordered_map<int, Front> fronts_;  ///< by channel
  Roster workers_;
  std::deque<Held> waiting_;
  ServerClock::time_point nextStart_;
  bool isStopping_ = false;
};

}  // namespace QELO
