#pragma once

#include <json/json.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "programs/webapi-server/front/WorkerLinks.h"
#include "programs/webapi-server/workers/WorkerLimits.h"
#include "webapi/runner/road/CallRoad.h"

namespace QELO {

/// The road of one request through a front: its call is made by a worker of the method's account.
///
/// Nothing here waits long. An answer that is not there within milliseconds, or that the client's
/// socket may not hold, is left to a forked process of the front's, which waits and prints.
class FrontRoad : public CallRoad {
 public:
  /// @param connection  the client's, which is standard output too
  /// @param bodyLength  bytes of the body, which are all here and still unread
  /// @param mayFork     whether there may be one more process that waits
  FrontRoad(WorkerLinks& workers, const WorkerLimits& limits, int connection, int64_t bodyLength,
            bool mayFork)
      : workers_(workers),
        limits_(limits),
        connection_(connection),
        bodyLength_(bodyLength),
        mayFork_(mayFork) {}

  bool Takes(APIRequest& request, const Json::Value& attributes) override;
  bool Run(APIRequest& request, APIResponse& response, const Json::Value& attributes) override;
  void Answer(size_t bytes) override;
  void Leave() override { state_ = State::kLeft; }
  bool IsLeft() const override { return state_ == State::kLeft || state_ == State::kHandedOver; }

  /// Whether somebody else has to serve the request from the start.
  bool IsServedApart() const { return state_ == State::kLeft; }
  /// Whether a forked process serves it, and this is the front.
  bool IsHandedOver() const { return state_ == State::kHandedOver; }
  /// Whether this is that process.
  bool IsWaiter() const { return state_ == State::kWaiter; }
  /// The process that was forked; 0: none.
  pid_t Waiter() const { return waiter_; }

 private:
  enum class State { kHere, kLeft, kHandedOver, kWaiter };

  bool HandOver();
  bool Ask(const std::string& key, const std::string& call, std::string& answer);
  bool TakeAnswer(WorkerLink& worker, WorkerLink::Coming coming, const std::string& key,
                  std::string& answer);
  void TakeBody();

  WorkerLinks& workers_;
  const WorkerLimits& limits_;
  const int connection_;
  int64_t bodyLength_;
  const bool mayFork_;
  State state_ = State::kHere;
  pid_t waiter_ = 0;
};

}  // namespace QELO
