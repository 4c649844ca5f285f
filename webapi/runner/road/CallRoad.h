#pragma once

#include <json/json.h>

#include <cstddef>

namespace QELO {

class APIRequest;
class APIResponse;

/// A road for calls that leads out of the process which takes their requests in: one request each.
///
/// A request may be left alone at any time before its call is made or its answer printed: then
/// nothing of it has happened, and another process serves it from the start.
class CallRoad {
 public:
  virtual ~CallRoad() = default;

  /// Whether the call may go by this road, asked before any permission. No: the request is left.
  virtual bool Takes(APIRequest& request, const Json::Value& attributes) = 0;
  /// Makes the permitted call, or leaves the request.
  /// @return whether the method was called and returned; else the response has the error
  virtual bool Run(APIRequest& request, APIResponse& response, const Json::Value& attributes) = 0;
  /// Asked when an answer is ready: may leave it to another process as well.
  /// @param bytes  that are to be printed
  virtual void Answer(size_t bytes) = 0;
  /// Leaves the request, which this road is not for.
  virtual void Leave() = 0;
  /// Whether the request is left: this process prints nothing.
  virtual bool IsLeft() const = 0;
};

}  // namespace QELO
