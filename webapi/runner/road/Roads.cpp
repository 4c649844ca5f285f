// The runner's calls in processes that stay: where they are taken in, and where they are made.

#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/base/MemoryBound.h"
#include "webapi/platform/Core.h"
#include "webapi/runner/APIRunnerPrivate.h"
#include "webapi/runner/APIRunnerRooms.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/execution/Execution.h"
#include "webapi/runner/execution/ParamCheck.h"

namespace QELO {

void APIRunner::SetRoad(CallRoad* road) {
  rooms_->road = road;
}

CallRoad* APIRunner::Road() const {
  return rooms_->road;
}

bool APIRunner::TakesRoad(APIRequest* request) {
  const CallName call(*request);
  return rooms_->road->Takes(*request, GetMethod(call.api, call.version, call.method));
}

bool APIRunner::RunByRoad(APIRequest* request, APIResponse* response,
                          const Json::Value& attributes) {
  CallRoad& road = *rooms_->road;
  MemoryBound::Lift();  // whoever calls is known, and the answer is as large as the method makes it
  const bool called = ParamCheck::Passes(*request, *response, attributes) &&
                      road.Run(*request, *response, attributes);
  if (!road.IsLeft()) {
    CountCall(request, attributes);
  }
  return called;
}

bool APIRunner::ProcessPermitted(APIRequest* request, APIResponse* response) {
  QLIBCErrSetEx(0, "APIRunner.cpp", __LINE__);  // of the call before
  private_->ForgetCallName();                   // the log was closed since, and opens unnamed
  return SetProcessName(request, response) &&
         Execution(*this, request, response, Execution::Account::kTaken)
             .Run(Json::Value(Json::objectValue));
}

}  // namespace QELO
