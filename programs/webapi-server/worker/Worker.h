#pragma once

#include <sys/stat.h>
#include <time.h>

#include <map>
#include <memory>
#include <string>

#include "programs/webapi-server/front/WorkerLink.h"
#include "programs/webapi-server/worker/Remains.h"
#include "programs/webapi-server/workers/CallClock.h"
#include "programs/webapi-server/workers/Ending.h"
#include "programs/webapi-server/workers/WorkerLimits.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {

class WorkerRunner;

/// The process that runs the methods of one account, one call after the other. It has given up
/// everything else for good before the first comes, and ends rather than let one call see what
/// another has left. A call that crashes, or takes too long, takes the worker with it.
class Worker {
 public:
  /// @param key         whose calls, see WorkerMessage::KeyOf()
  /// @param clock       tells the server since when a call is made
  /// @param argc, argv  main()'s, whose area shows the call
  Worker(UniqueFd socket, std::string key, CallClock clock, const WorkerLimits& limits, int argc,
         char** argv);
  ~Worker();

  /// @return the process's exit status, see Ending
  int Run();

 private:
  enum class After { kGoOn, kEnd };

  bool Prepare();
  bool Receive(std::string& text);
  After Serve(std::string& text);
  bool IsSameLibrary(const std::string& path);
  void SetTimer(bool runs) const;

  const int socket_;
  WorkerLink front_;
  const std::string key_;
  CallClock clock_;
  const WorkerLimits limits_;
  const int argc_;
  char** const argv_;
  timer_t timer_{};
  Ending ending_ = Ending::kTold;
  Remains remains_;
  std::unique_ptr<WorkerRunner> runner_;
  std::map<std::string, struct stat> libraries_;  ///< as they were when they were opened
};

}  // namespace QELO
