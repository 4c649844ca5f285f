#pragma once

#include <sys/types.h>

#include <memory>
#include <string>

#include "webapi/APIResponse.h"
#include "webapi/model/APIBase.h"

namespace ARDO {
class Task;
}

namespace QELO {

/// The state of a response.
///
/// Sections: "headers" (name to text), "setCookie" (list of Set-Cookie texts), "success" (empty),
/// "option" ("isDownload", "restart_httpd", "statusMsg"), "code" (integer) and, once a result was
/// set, "body".
class APIResponsePrivate : public APIBase {
 public:
  APIResponsePrivate(APIRequest* request, APIResponse* owner);
  APIResponsePrivate(const APIResponsePrivate&) = delete;
  APIResponsePrivate& operator=(const APIResponsePrivate&) = delete;
  ~APIResponsePrivate() override;

  void SetError(int code, const Json::Value& data);
  bool AddCookie(const std::string& name, const std::string& value, const std::string& path,
                 long expireMinutes, const std::string& domain, bool secure, bool httpOnly);
  bool SetStatus(int code, const std::string& message);
  /// Sets "Location" alone.
  bool Redirect(const std::string& path);
  void SetCallbackFunc(APIResponse::CallbackFunc function, void* argument);

  APIResponse::CallbackList& callbacks() { return callbacks_; }
  /// Whether a background task could not store the result that it was given last.
  bool TaskLacksResult() const { return lacksResult_; }

 private:
  /// "; expires=..." of a cookie, or "".
  std::string CookieExpiry(long minutes) const;
  bool AppendCookie(const std::string& line);
  /// Makes the handle of the background task that the request is, unless this process has one.
  void PrepareTask();
  /// Makes the body the result of the task, if there is a handle of one.
  void UpdateTask();

  APIRequest* request_;
  APIResponse* owner_;
  std::unique_ptr<ARDO::Task> task_;  ///< null until a background task sets a result
  APIResponse::CallbackList callbacks_;
  pid_t taskProcess_ = 0;  ///< the one that made the handle
  bool lacksResult_ = false;
};

}  // namespace QELO
