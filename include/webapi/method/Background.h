#pragma once

#include <json/json.h>

#include <time.h>

#include <type_traits>
#include <utility>

#include "webapi/APIPolling.h"
#include "webapi/method/Call.h"
#include "webapi/method/Edge.h"

namespace QELO {

/// How work in the background is recorded and limited; see APIPolling.
struct Background {
  const char* prefix = "";  ///< the task id starts with it
  const char* group = "";   ///< "": the caller's own task; "admin", "everyone"
  int limit = 0;  ///< so many of the owner's tasks with the prefix run at once; 0: any number
  bool keepResult = false;  ///< the record, and the last result with it, stays when the work ends
  bool hideParams = false;  ///< the record does not tell the parameters of the call
};

/// What work in the background tells of itself while it goes on.
class Progress {
 public:
  /// Between two that are stored, since each changes the task's record.
  static constexpr long kPauseMs = 200;

  explicit Progress(APIResponse& response) : response_(response) {}

  /// Whether the next Tell() will be stored. What is dear to put together can be left until then.
  bool IsDue() const { return told_ == 0 || Now() - told_ >= kPauseMs; }
  /// What a status shows from now on, as the data of a success; not more often than every kPauseMs.
  template <typename T>
  void Tell(const T& value) {
    value_ = ToJson(value);
    isUntold_ = true;
    if (IsDue()) {
      Finish();
    }
  }
  /// Stores what was told last, unless it is stored already; for the end of the work.
  void Finish() {
    if (isUntold_) {
      response_.SetSuccess(value_);
      told_ = Now();
      isUntold_ = false;
    }
  }

 private:
  static long Now() {
    timespec time{};
    clock_gettime(CLOCK_MONOTONIC, &time);
    return time.tv_sec * 1000 + time.tv_nsec / 1000000;
  }

  APIResponse& response_;
  Json::Value value_ = {};
  bool isUntold_ = true;  ///< work that tells nothing ends with success all the same
  long told_ = 0;         ///< ms since the host started; 0: never
};

/// Goes on in the background after the answer, which is {"task_id": ...}.
///
///     return QELO::StartWork(call, {.prefix = "import_"}, [=](QELO::Progress& progress) {
///       ...
///       return summary;
///     });
///
/// What the work returns is the task's last result; an Error that it throws, or returns, is so too,
/// and another exception is 117 and logged. Work that returns nothing ends with what it told last.
/// @param work  called in another process, which has a copy of all that was there
/// @throw Error  500 to 508 as of APIPolling: 507 when as many run as the limit allows
template <typename Work>
Answered StartWork(const Call& call, const Background& terms, Work work) {
  static_assert(std::is_invocable_v<Work&, Progress&>,
                "work is a function of QELO::Progress&: [=](QELO::Progress& progress) { ... }");
  APIPolling polling(&call.Request());
  polling.SetPrefixAttr(terms.prefix);
  polling.SetRemoveAttr(!terms.keepResult);
  polling.SetRemoveParam(terms.hideParams);
  polling.SetLimit(terms.limit);
  if (!polling.SetGroupAttr(terms.group)) {
    throw Error{WEBAPI_ERR_NO_PERMISSION};
  }
  const int before = call.Response().GetError();
  const auto run = [](APIRequest*, APIResponse* response, void* argument) {
    method::Guarded(*response, [&] {
      Progress progress(*response);
      Work& todo = *static_cast<Work*>(argument);
      if constexpr (std::is_void_v<decltype(todo(progress))>) {
        todo(progress);
        progress.Finish();
      } else {
        method::Answer(*response, todo(progress));
      }
    });
  };
  if (!polling.Start(&call.Response(), run, &work) && call.Response().GetError() == before) {
    throw Error{polling.GetError()};
  }
  return {};
}

}  // namespace QELO
