#pragma once

#include <sys/types.h>

#include <string>
#include <unordered_map>

#include "programs/server/metrics/Metrics.h"
#include "programs/webapi-server/workers/CallClock.h"
#include "programs/webapi-server/workers/WorkerLimits.h"

namespace QELO {

/// The workers that there are. It counts and logs how they end.
class Roster {
 public:
  Roster(const WorkerLimits& limits, Metrics::Staying& figures)
      : limits_(limits), figures_(figures) {}

  /// Whether there may be one more for an account. @param key  see WorkerMessage::KeyOf()
  bool HasRoomFor(const std::string& key) const;
  void Add(pid_t pid, const std::string& key, CallClock clock);
  /// @param status  as waitpid(2) gives it
  /// @return whether it was a worker
  bool TakeEnded(pid_t pid, int status);
  bool IsEmpty() const { return workers_.empty(); }
  void KillAll() const;

 private:
  struct Entry {
    std::string key;
    CallClock clock;
  };
  void Tell(pid_t pid, const Entry& worker, int status);

  const WorkerLimits limits_;
  Metrics::Staying& figures_;
  std::unordered_map<pid_t, Entry> workers_;
  std::unordered_map<std::string, unsigned> workersOf_;  ///< by key
};

}  // namespace QELO
