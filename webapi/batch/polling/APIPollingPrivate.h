#pragma once

#include <sys/types.h>

#include <functional>
#include <memory>
#include <string>

#include "webapi/APIPolling.h"
#include "webapi/model/APIBase.h"

namespace ARDO {
class Task;
}

namespace QELO {

/// The state of a polling object.
///
/// Section: "polling_attribute" with "task_id_prefix" (text), "share_to_group" (text),
/// "auto_remove" and "auto_remove_params" (bool).
class APIPollingPrivate : public APIBase {
 public:
  /// @param request  may be null
  APIPollingPrivate(APIRequest* request, APIPolling* owner);
  APIPollingPrivate(const APIPollingPrivate&) = delete;
  APIPollingPrivate& operator=(const APIPollingPrivate&) = delete;
  ~APIPollingPrivate();

  bool SetGroupAttr(const std::string& group);
  bool Start(APIResponse* response, APIPolling::Work work, void* arg);
  bool Status(const std::string& fullId, Json::Value& out);
  bool Status(const Json::Value& fullIds, Json::Value& out);
  bool Wait(const std::string& fullId, const std::string& state, int seconds, Json::Value& out);
  bool Stop(const std::string& fullId, bool remove);
  bool List(const std::string& prefix, const Json::Value& groups, Json::Value& out);
  bool Keep(const std::string& fullId);
  bool Release(const std::string& fullId);
  bool CountRunning(const std::string& prefix, int& count);

  /// Splits at the first "/". @return false, and nothing is set, when there is none
  bool GetUserAndTaskID(const std::string& fullId, std::string& owner, std::string& taskId) const;
  /// Whether the login user may touch the owner's tasks.
  bool CheckTaskUser(const std::string& owner) const;
  /// Asks a process to end.
  /// @param isStill  whether the number is that process's still; asked with the process in hand,
  ///                 which whoever gets the number later is not; null: it is
  /// @return whether it was asked, or is gone
  bool DoKill(pid_t pid, const std::function<bool()>& isStill = nullptr) const;
  /// The full ids of a text, of an object's or of an array's members; else null.
  Json::Value ConverToFullTaskId(const std::string& owner, const Json::Value& ids) const;

  void SetRequest(APIRequest* request) { request_ = request; }
  /// Takes a request of its own, of a user for whom the program answers.
  void SetUser(const std::string& user);
  void SetLimit(int most) { limit_ = most; }
  void SetError(int code) { error_ = code; }
  int error() const { return error_; }

 private:
  /// Sets the error. @return false
  bool Fail(int code);
  bool HasRequest();
  std::string LoginUser() const;
  bool IsAdmin() const;
  /// The attribute's text or truth.
  std::string Attribute(const char* name) const;
  bool IsSet(const char* name, bool def) const;
  /// @return 0, or the response's error
  int FindOwner(const std::string& group, std::string& owner) const;
  Json::Value DescribeCall() const;
  /// Loads one of the caller's tasks by what a client sent. @return null with the error set
  std::unique_ptr<ARDO::Task> FindTask(const std::string& fullId);
  /// Loads a task of an owner who was checked. @return null when there is none
  /// @param busy  receives whether there may be one all the same
  static std::unique_ptr<ARDO::Task> LoadTask(const std::string& owner, const std::string& taskId,
                                              bool& busy);
  /// Sets the error of a task that was not loaded. @return false
  bool FailUnread(const std::string& fullId, bool busy);
  /// Counts the owner's tasks that have not ended.
  /// @param taskId  only those that are older than this one; "": all
  /// @return false, with the error set, when that cannot be told
  bool CountBefore(const std::string& owner, const std::string& prefix, const std::string& taskId,
                   int& count);
  /// Whether the task that was just recorded may run. @return false with the error set
  bool IsWithinLimit(const std::string& owner, const std::string& taskId);
  /// Asks the task's process, if one is recorded, to end. @return false with the error set
  bool EndProcess(const ARDO::Task& task, const std::string& fullId);
  Json::Value StatusOf(const ARDO::Task& task) const;
  static void LeaveStarter(pid_t starter) noexcept;
  [[noreturn]] void RunChild(const std::string& owner, const std::string& taskId,
                             APIResponse* response, APIPolling::Work work, void* arg) noexcept;
  /// Ends the task whose work is over.
  void FinishTask(ARDO::Task& task, APIResponse* response) const;

  APIPolling* owner_;
  APIRequest* request_;
  int error_;
  int limit_ = 0;
  std::unique_ptr<APIRequest> ownRequest_;
};

}  // namespace QELO
