#pragma once

#include <sys/types.h>

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

  bool SetGroupAttr(const std::string& group);
  bool Start(APIResponse* response, APIPolling::Work work, void* arg);
  bool Status(const std::string& fullId, Json::Value& out);
  bool Status(const Json::Value& fullIds, Json::Value& out);
  bool Wait(const std::string& fullId, const std::string& state, int seconds, Json::Value& out);
  bool Stop(const std::string& fullId, bool remove);
  bool List(const std::string& prefix, const Json::Value& groups, Json::Value& out);

  /// Splits at the first "/". @return false, and nothing is set, when there is none
  bool GetUserAndTaskID(const std::string& fullId, std::string& owner, std::string& taskId) const;
  /// Whether the login user may touch the owner's tasks.
  bool CheckTaskUser(const std::string& owner) const;
  /// Asks a process to end. @return whether it was asked, or is gone
  bool DoKill(pid_t pid) const;
  /// The full ids of a text, of an object's or of an array's members; else null.
  Json::Value ConverToFullTaskId(const std::string& owner, const Json::Value& ids) const;

  void SetRequest(APIRequest* request) { request_ = request; }
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
  /// Finds one of the caller's tasks by what a client sent. @return false with the error set
  bool FindTask(const std::string& fullId, std::string& owner, std::string& taskId);
  Json::Value StatusOf(const ARDO::Task& task) const;
  [[noreturn]] void RunChild(const std::string& owner, const std::string& taskId,
                             APIResponse* response, APIPolling::Work work, void* arg) noexcept;

  APIRequest* request_;
  APIPolling* owner_;
  int error_;
};

}  // namespace QELO
