#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRunner.h"
#include "webapi/Export.h"

namespace QELO {

/// The front of one CGI invocation: reads the request from the CGI environment and standard
/// input, checks the caller, runs the API and prints headers and body to standard output.
///
///     int main(int argc, char** argv) {
///       QELO::WebEntry entry;
///       entry.SetArgs(argc, argv);
///       return entry.Run(Json::Value()) ? 0 : 1;
///     }
///
/// Changes the process environment when credentials come as parameters. Run once, then destroy.
class WEBAPI_API WebEntry : public APIRunner {
 public:
  WebEntry();
  ~WebEntry() override;

  /// Serves the request; the argument is not consulted.
  /// @return whether callbacks were started. What became of the request is in the answer.
  bool Run(const Json::Value& param) override;
  bool Initialize(const Json::Value& param) override;
  bool CheckSharingPermission(APIRequest* request, APIResponse* response) override;
  bool NeedPermission(APIRequest* request) override;
  bool CheckPermission(APIRequest* request, APIResponse* response) override;
  bool HandleUpload(APIRequest* request, APIResponse* response) override;
  bool SkipPermission(APIRequest* request) override;

 protected:
  /// Authenticates the caller and fills the request's session.
  /// @param allowTimeout  whether a timed-out session is accepted
  /// @return 0, or the web-API error code. Asked once per process and allowance.
  int CheckPermission(bool allowTimeout);

  bool InitParam(Json::Value& params);
  bool InitGetParam(Json::Value& section);
  bool InitPostParam(Json::Value& section);
  bool LoadUploadAPIDesc(Json::Value& section);
  bool DetectAndDecryptParamLine(const std::string& line, Json::Value& section);
  bool DecryptParam(const std::string& text, Json::Value& section);
  bool DecryptAESParam(Json::Value& section);

  void OutputHeader();
  void OutputBody();
  bool ProcessRelay(APIRequest* request, APIResponse* response);

 private:
  bool RewriteCredentials();
  int Authorise();
  void FillSession(const std::string& user);
  bool IsAllowedUser(APIRequest* request);

  Json::Value temporaryFiles_;
  alignas(void*) unsigned char cgiContext_[60];
  Json::Value permission_;
};

/// After-output callback that restarts the web server; the argument is not used.
WEBAPI_API void RestartHttpd(void* unused);

}  // namespace QELO
