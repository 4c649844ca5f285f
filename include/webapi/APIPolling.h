#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIPollingPrivate;
class APIRequest;
class APIResponse;

/// Work that goes on in the background after an API method has answered, and what clients may do
/// with it later: look at it, wait for it, stop it, list it.
///
/// A task belongs to an owner: the login user, all administrators ("@administrators") or everybody
/// ("@users"). Clients know it by its full id: owner, "/", task id.
///
/// A status is the body that the work has set last ({"success", "data" or "error"}), with "finish"
/// (bool: it ended), "auto_remove" (bool) and "info" ({"api", "version", "method", "param",
/// "group", "prefix"} of the call that started it).
///
/// An operation that fails returns false and leaves the reason in GetError():
///
/// | 500 | none was given yet                                                      |
/// | 501 | the record could not be changed                                         |
/// | 502 | no request, or bad parameters                                           |
/// | 503 | not a task id, or another user's task; List(): unknown group            |
/// | 504 | the store of the record is busy; there may be such a task all the same  |
/// | 505 | List(): the administrators' tasks, asked by somebody else               |
/// | 506 | the process could not be signalled                                      |
/// | 507 | Start(): as many tasks run as SetLimit() allows                         |
/// | 508 | no such task                                                            |
class WEBAPI_API APIPolling {
 public:
  using Work = void (*)(APIRequest*, APIResponse*, void*);

  /// Longest time that Wait() waits, in seconds: every waiting client holds a process of ours.
  static constexpr int kLongestWait = 60;

  APIPolling();
  /// @param request  the request that is served; not owned, must outlive this; may be null
  explicit APIPolling(APIRequest* request);
  APIPolling(const APIPolling&) = delete;
  APIPolling& operator=(const APIPolling&) = delete;
  virtual ~APIPolling();
  /// For programs that serve no request and answer for the user: what this user may do.
  static std::unique_ptr<APIPolling> ForUser(const std::string& user);
  void SetRequest(APIRequest* request);

  /// What the next Start() goes by. @return false, and nothing changes, when it is refused
  ///
  /// The task id starts with this. Default: "".
  bool SetPrefixAttr(const std::string& prefix);
  /// The record is removed when the work ends, its last result with it. Default: true.
  bool SetRemoveAttr(bool remove);
  /// "info" has no "param". Default: false.
  bool SetRemoveParam(bool remove);
  /// "": the login user's own task, the default; "admin": the administrators', by one of them
  /// only; "everyone": everybody's, who may all see its parameters and stop it.
  bool SetGroupAttr(const std::string& group);
  /// So many of the owner's tasks with the prefix run at once, however many are started at the same
  /// moment; a further start is 507. 0: any number, the default.
  void SetLimit(int most);

  /// Runs `work` in a background process, which outlives the request and has the credentials of
  /// the moment. The response answers {"task_id": full id}: at once when the work sets its first
  /// result, after 0.6 s at the latest.
  ///
  /// In the background process: `work` gets the same request and response and sets a result as
  /// often as it likes; each is what a status shows from then on. The request's environment is
  /// replaced by "task_id", "task_user" and "full_task_id". When `work` returns or throws the task
  /// ends with the result that was stored last, error 117 when none was. It need not return: a stop
  /// is SIGTERM. Standard streams lead to /dev/null; ends of pipes and socket pairs whose other end
  /// only other processes have lead there too. `work` does not run when the task was stopped
  /// before.
  ///
  /// "info" never holds the credentials that a request may carry as parameters.
  /// @param arg  handed to `work`
  /// @return false without a task. The response's error is then 105 (group "admin", and the user
  ///         is no administrator), 110 (fork failed), 114 (unknown group), or as it was.
  bool Start(APIResponse* response, Work work, void* arg);

  /// The status of one task.
  bool Status(const std::string& fullId, Json::Value& out);
  bool Status(const char* fullId, Json::Value& out);
  /// The status of each task by its full id; {} for one that is missing or not the caller's,
  /// {"busy": true} for one whose store is busy.
  /// @param fullIds  array of strings
  bool Status(const Json::Value& fullIds, Json::Value& out);

  /// The status of one task once it differs from one seen before, when the task has ended, or when
  /// the time is over; with the member "state", which names it.
  /// @param state    the "state" of the status seen last; "": as it is now
  /// @param seconds  at most kLongestWait; 0 or less: answers at once
  bool Wait(const std::string& fullId, const std::string& state, int seconds, Json::Value& out);

  /// Ends a task: its process gets SIGTERM, its status stays as it was.
  /// @param remove  removes the record as well
  /// An id that cannot be split is 502 here.
  bool Stop(const std::string& fullId, bool remove);

  /// Keeps the record of a task that would go with the end of its work, its last result with it.
  /// @return whether it does so because of this; 500 in GetError() when it is kept anyway
  bool Keep(const std::string& fullId);
  /// Takes Keep() back: the record goes with the end of the work, at once when that has ended.
  bool Release(const std::string& fullId);

  /// The full ids of the caller's tasks by group: arrays, null for none.
  /// @param prefix  only task ids that start with it; "": all
  /// @param groups  array of "user", "admin" and "everyone"
  bool List(const std::string& prefix, const Json::Value& groups, Json::Value& out);

  /// How many of the login user's own tasks have not ended. Costs what the running ones cost,
  /// however many records of ended ones there are.
  /// @param prefix  only task ids that start with it; "": all
  bool CountRunning(const std::string& prefix, int& count);

  void SetError(int code);
  int GetError() const;
  /// What an error above means, for people; null for other numbers.
  static const char* ErrorText(int code);

 private:
  std::unique_ptr<APIPollingPrivate> private_;
};

}  // namespace QELO
