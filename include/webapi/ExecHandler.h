#pragma once

#include <json/json.h>

#include <cstddef>
#include <memory>
#include <string>

#include "webapi/APIRunner.h"
#include "webapi/Export.h"

namespace QELO {

class ExecParam;
class Pipe;

/// Carries out one API call for a program that is not serving a request; see APIRunner::Exec().
class WEBAPI_API ExecHandler {
 public:
  /// @param param  outlives the handler
  explicit ExecHandler(const ExecParam& param);
  ExecHandler(const ExecHandler&) = delete;
  ExecHandler& operator=(const ExecHandler&) = delete;
  virtual ~ExecHandler();

  /// The whole call. A method whose credentials can be given back runs in this process, all others
  /// and those with an output descriptor in a forked child.
  /// @return the answer's body with "httpd_restart", or {"success": false, "error": {"code"}} with
  ///         101 when API, method or user is missing and 117 when the child came to nothing
  Json::Value Process();

  /// After Process(): the errno of the first write to the output descriptor that failed; what came
  /// from there on is dropped, and the answer is the call's all the same. 0: all was written.
  int GetOutputError() const { return outputError_; }

  /// The steps of Process().
  ///
  /// @return false, with the result set (101), when the call lacks API, method or user
  bool CheckParams();
  /// Builds the request that Run() makes: the call's parameters as those of a POST, in a session of
  /// its user that is authorised.
  void PrepareReq();
  /// Makes the call in this process, and keeps its answer as the result.
  /// @param inChild  the process is a child made for the call, so nothing is given back. Else the
  ///                 variables USERNAME and QELO_WEBAPI_USERNAME get the former value of the
  ///                 latter when it had one, and otherwise keep the call's user.
  void Run(bool inChild);
  /// Makes the call in a child and waits for its answer; 117 when none comes.
  void RunFork();
  /// As RunFork(), and writes what the method prints behind its header lines to the call's
  /// descriptor, while the child runs. A method that sends a download answers "HTTP_RANGE" and
  /// "HTTP_IF_RANGE" of the call's environment, and no condition of a request that this process
  /// may be serving. Header lines that do not end within the first 4095 bytes
  /// take all of the output with them. A descriptor that takes no more loses the rest (logged).
  void RunForkForStdout();

 protected:
  /// For who watches what RunForkForStdout() gets. The header block, with its empty line, before
  /// what stands behind it is written to the descriptor.
  virtual void OutputBegins(const std::string& head);
  /// So many bytes more are written.
  virtual void OutputGrows(size_t bytes);
  /// Takes the upload that the environment of a call to a method with "allowUpload" announces. Here
  /// it is left to the method. Temporary files belong to the method's account already.
  /// @return false, with the response's error set, when it cannot be taken
  virtual bool HandleUpload(APIRunner& runner, APIRequest* request, APIResponse* response);
  /// In a child that was forked for the call, when that has ended; with the method's rights, where
  /// they are not given back.
  virtual void CallEnded();

 private:
  int CopyBody(Pipe& output, int fd);
  void Fail(int code);
  /// An exception must end the child here: the code around the caller is the parent's.
  [[noreturn]] void RunChild(Pipe& result) noexcept;
  void ReceiveResult(Pipe& result, int child);

  class Runner;  // asks for uploads here

  const ExecParam* param_;
  std::unique_ptr<APIRunner> runner_;
  Json::Value request_;
  Json::Value result_;
  int outputError_ = 0;
};

}  // namespace QELO
