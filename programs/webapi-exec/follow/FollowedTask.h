#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/APIPolling.h"

namespace QELO::ExecProgram {

/// A background task as one user sees it.
///
/// The operations are those of QELO.Work.Task, and check as it does whose the task is; but they run
/// with the rights of this process, so an ordinary user can follow tasks of the own.
class FollowedTask {
 public:
  /// @param user  login user as whom the task is seen
  /// @param id    full id
  FollowedTask(const std::string& user, const std::string& id);

  const std::string& Id() const { return id_; }

  /// The status now. @return 0, or the code of the failure
  int Look(Json::Value& status) const;
  /// The status once it differs from `state`. @return 0, or the code of the failure
  int Wait(const std::string& state, int seconds, Json::Value& status) const;
  /// Ends the task. @return 0, or the code of the failure
  int Stop() const;

  /// Keeps a record that would go with the end of the work, its last result with it, until
  /// Release(). To be called after a Look() that succeeded.
  void Keep();
  /// Removes the record that was kept, or lets it go with the end of the work as before.
  void Release();

 private:
  std::unique_ptr<APIPolling> polling_;
  std::string id_;
  bool isKept_ = false;
};

/// What a code of these operations means.
const char* taskErrorText(int code);

}  // namespace QELO::ExecProgram
