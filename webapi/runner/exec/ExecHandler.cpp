#include "webapi/ExecHandler.h"

#include <errno.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <string>
#include <string_view>

#include "webapi/APIRequest.h"
#include "webapi/ExecParam.h"
#include "webapi/JsonHelper.h"
#include "webapi/Pipe.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/base/NullDevice.h"
#include "webapi/base/TextFile.h"
#include "webapi/batch/pipe/AnswerPipe.h"
#include "webapi/model/request/CallerSession.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"
#include "webapi/platform/Upload.h"
#include "webapi/runner/execution/MethodAccount.h"
#include "webapi/runner/execution/StandardStreams.h"
#include "webapi/runner/execution/WorkingDirectory.h"

namespace QELO {
namespace {

constexpr char kSource[] = "ExecHandler.cpp";
/// Leaves the child's standard descriptors as they are.
constexpr int kForkFlags = 65;
constexpr char kUserVariable[] = "USERNAME";
constexpr size_t kChunkSize = 4096;
constexpr size_t kLongestHead = 65536;  ///< bytes that are kept of a header block
constexpr int kReapTries = 20;
constexpr useconds_t kReapPauseMicroseconds = 5000;
constexpr std::string_view kHeaderEnd = "\r\n\r\n";

Json::Value objectOr(const Json::Value& value) {
  return value.isObject() ? value : Json::Value(Json::objectValue);
}

/// Programs that call APIs may live long, so no dead child is left to them.
/// @param isEnding  it ends at once; one that hung up may be busy for long, and is left to itself
void reap(pid_t child, bool isEnding) {
  if (isEnding) {
    TEMP_FAILURE_RETRY(waitpid(child, nullptr, 0));
    return;
  }
  for (int i = 0; i < kReapTries && waitpid(child, nullptr, WNOHANG) == 0; ++i) {
    usleep(kReapPauseMicroseconds);
  }
}

bool isSameFile(int left, int right) {
  struct stat first {};
  struct stat second {};
  return fstat(left, &first) == 0 && fstat(right, &second) == 0 && first.st_dev == second.st_dev &&
         first.st_ino == second.st_ino;
}

/// The parent takes the result when it has seen the end of the output, so who still has to write
/// the result must not hold the output.
void letGoOfOutput() {
  if (isSameFile(STDOUT_FILENO, STDERR_FILENO)) {
    LetGoOf({STDOUT_FILENO, STDERR_FILENO});
  } else {
    LetGoOf({STDOUT_FILENO});
  }
}

/// Downloads answer to the request that the process environment tells. In the child that is what
/// the call asks for, and not what this process may be serving.
void tellRequest(const Json::Value& environment) {
  unsetenv("REQUEST_METHOD");
  for (const char* name : {"HTTP_RANGE", "HTTP_IF_RANGE"}) {
    const std::string value = JsonHelper::asString(JsonHelper::member(environment, name));
    unsetenv(name);
    if (!value.empty()) {
      setenv("REQUEST_METHOD", "GET", 1);
      setenv(name, value.c_str(), 1);
    }
  }
  for (const char* name : {"HTTP_IF_MATCH", "HTTP_IF_NONE_MATCH", "HTTP_IF_MODIFIED_SINCE",
                           "HTTP_IF_UNMODIFIED_SINCE", "GATEWAY_INTERFACE"}) {
    unsetenv(name);
  }
}

/// Temporary files of the upload shall belong to whom the method will run as.
void setUploadOwner(APIRunner& runner, APIRequest& request) {
  uid_t uid = 0;
  gid_t gid = 0;
  const std::string account = MethodAccount(
      request,
      runner.GetMethod(request.GetAPIClass(), request.GetAPIVersion(), request.GetAPIMethod()));
  if (!account.empty() && QELOUserGetUGID(account.c_str(), &uid, &gid) == 0) {
    QeloCgiUploadOwnerSet(uid, gid);
  }
}

/// A file in slices is put together for one caller alone.
void setUploadCaller(const APIRequest& request) {
  uid_t uid = 0;
  gid_t gid = 0;
  if (request.IsSliceUploadRequest() &&
      QELOUserGetUGID(request.GetLoginUserName().c_str(), &uid, &gid) == 0) {
    QeloCgiUploadCallerSet(uid);
  }
}

}  // namespace

class ExecHandler::Runner : public APIRunner {
 public:
  explicit Runner(ExecHandler& handler) : handler_(handler) {}

 protected:
  bool HandleUpload(APIRequest* request, APIResponse* response) override {
    setUploadOwner(*this, *request);
    setUploadCaller(*request);
    return handler_.HandleUpload(*this, request, response);
  }

 private:
  ExecHandler& handler_;
};

ExecHandler::ExecHandler(const ExecParam& param)
    : param_(&param), runner_(std::make_unique<Runner>(*this)) {}

ExecHandler::~ExecHandler() {
  const StandardStreams shut(true, true);  // destructors of API libraries are foreign code
  runner_->CloseLib();
}

Json::Value ExecHandler::Process() {
  const WorkingDirectory former;
  if (chdir(Paths::kDescriptionDir) != 0) {
    WEBAPI_LOG(kSource, "cannot enter %s [%m]", Paths::kDescriptionDir);
  }
  if (!CheckParams()) {
    return result_;
  }
  PrepareReq();
  if (param_->GetOutputFd() >= 0) {
    RunForkForStdout();
    return result_;
  }
  APIRequest request(request_);
  if (runner_->GetMethodAttr(&request, "grantable") ||
      runner_->GetMethodAttr(&request, "grantByDefault")) {
    Run(false);
  } else {
    RunFork();
  }
  return result_;
}

bool ExecHandler::CheckParams() {
  if (!param_->GetAPI().empty() && !param_->GetMethod().empty() && !param_->GetRunner().empty()) {
    return true;
  }
  Fail(WEBAPI_ERR_BAD_REQUEST);
  WEBAPI_LOG(kSource, "missing parameter.");
  return false;
}

void ExecHandler::PrepareReq() {
  request_["session"] = CallerSession::OfUser(param_->GetRunner());
  request_["environ"] = objectOr(param_->GetEnv());
  request_["environ"]["REQUEST_METHOD"] = "POST";
  request_["postParam"] = objectOr(param_->GetParams());
  request_["postParam"]["api"] = param_->GetAPI();
  request_["postParam"]["method"] = param_->GetMethod();
  request_["postParam"]["version"] = param_->GetVersion();
  request_["attr"] = objectOr(param_->GetAttr());
}

void ExecHandler::Run(bool inChild) {
  const char* set = inChild ? nullptr : getenv(kCallerVariable);
  const bool restore = set != nullptr;
  const std::string former = restore ? set : "";
  const std::string user = param_->GetRunner();
  setenv(kUserVariable, user.c_str(), 1);
  setenv(kCallerVariable, user.c_str(), 1);
  runner_->Run(request_);
  result_ = runner_->GetResponse();
  if (restore) {
    // Both from the one variable: outside of calls the two are the same user.
    setenv(kUserVariable, former.c_str(), 1);
    setenv(kCallerVariable, former.c_str(), 1);
  }
}

void ExecHandler::RunFork() {
  Pipe result;
  const pid_t child = result.Init() ? QLIBCProcForkEx(kForkFlags) : -1;
  if (child < 0) {
    Fail(WEBAPI_ERR_NO_ANSWER);
    WEBAPI_LOG(kSource, "fork failed");
    return;
  }
  if (child == 0) {
    RunChild(result);
  }
  ReceiveResult(result, child);
}

void ExecHandler::RunForkForStdout() {
  Pipe result;
  Pipe output;
  const pid_t child = result.Init() && output.InitStream() ? QLIBCProcForkEx(kForkFlags) : -1;
  if (child < 0) {
    Fail(WEBAPI_ERR_NO_ANSWER);
    WEBAPI_LOG(kSource, "fork failed");
    return;
  }
  if (child == 0) {
    tellRequest(JsonHelper::member(request_, "environ"));
    output.WriteOnly(STDOUT_FILENO);
    output.Close();  // a background process that the method leaves must not hold it, too
    RunChild(result);
  }
  output.ReadOnly(-1);
  result.ReadOnly(-1);
  outputError_ = CopyBody(output, param_->GetOutputFd());
  ReceiveResult(result, child);
}

void ExecHandler::OutputBegins(const std::string&) {}

void ExecHandler::OutputGrows(size_t) {}

void ExecHandler::CallEnded() {}

bool ExecHandler::HandleUpload(APIRunner&, APIRequest*, APIResponse*) {
  return true;
}

/// Copies what stands behind the header block of CGI output. The block's end must come within one
/// read, or all is dropped.
/// @return 0, or the errno of the write that failed
int ExecHandler::CopyBody(Pipe& output, int fd) {
  char chunk[kChunkSize] = {};
  bool inBody = false;
  int error = 0;
  std::string head;
  for (int count; (count = output.Read(chunk, kChunkSize - 1)) > 0;) {
    std::string_view text(chunk, static_cast<size_t>(count));
    if (!inBody) {
      const size_t end = text.find(kHeaderEnd);
      inBody = end != std::string_view::npos;
      const size_t length = inBody ? end + kHeaderEnd.size() : text.size();
      head.append(text.substr(0, std::min(length, kLongestHead - head.size())));
      text.remove_prefix(length);
      if (inBody) {
        OutputBegins(head);
      }
    }
    if (error == 0 && !WriteText(fd, text)) {
      error = errno;  // the child must not wait for us, so the rest is read all the same
      WEBAPI_LOG(kSource, "write output failed [%m]");
    }
    OutputGrows(error == 0 ? text.size() : 0);
  }
  return error;
}

void ExecHandler::RunChild(Pipe& result) noexcept {
  result.WriteOnly(-1);
  takeAnswerPipe(result);
  Run(true);
  CallEnded();
  std::cout.flush();
  fflush(stdout);
  letGoOfOutput();
  if (!result.WriteJson(result_)) {
    WEBAPI_LOG(kSource, "write json failed");
    if (!result.HasWritten()) {
      // There was no room for it, or no reader would take it: say that much.
      Fail(WEBAPI_ERR_NO_ANSWER);
      result.WriteJson(result_);
    }
  }
  _exit(0);
}

void ExecHandler::ReceiveResult(Pipe& result, pid_t child) {
  result.ReadOnly(-1);
  const bool received = result.ReadJson(result_) && result_.isObject();
  if (!received) {
    Fail(WEBAPI_ERR_NO_ANSWER);
    WEBAPI_LOG(kSource, "read json failed");
  }
  result.Close();
  reap(child, received);
}

void ExecHandler::Fail(int code) {
  result_ = Json::Value(Json::objectValue);
  result_["success"] = false;
  result_["error"]["code"] = code;
}

}  // namespace QELO
