#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "programs/webapi-server/front/FrontRoad.h"
#include "programs/webapi-server/front/WorkerLinks.h"
#include "programs/webapi-server/workers/ControlChannel.h"
#include "programs/webapi-server/workers/Ending.h"
#include "programs/webapi-server/workers/WorkerLimits.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {

/// The process that takes requests in, one after the other: intake, permission, the call by a
/// worker, the answer. No code of an API library runs in it. It never waits for a client: it gets
/// requests that are here as a whole. It ends when the server closes its channel, and by itself
/// after many requests, so that nothing grows.
class Front {
 public:
  /// @param argc, argv  main()'s, whose area shows the call
  Front(UniqueFd channel, const WorkerLimits& limits, int argc, char** argv);

  /// @return the process's exit status, see Ending
  int Run();

 private:
  UniqueFd StartWorker(const std::string& key);
  bool Serve(std::string& header, const UniqueFd& connection);
  void ReapWaiters();
  /// Why it is to take no more requests; kTold: nothing says so.
  Ending WornOut() const;

  const UniqueFd channel_;
  const WorkerLimits limits_;
  const int argc_;
  char** const argv_;
  WorkerLinks workers_;
  UniqueFd null_;
  std::vector<pid_t> waiters_;
  unsigned served_ = 0;
};

}  // namespace QELO
