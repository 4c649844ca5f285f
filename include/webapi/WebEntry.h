#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRunner.h"
#include "webapi/Export.h"

struct QeloCgiContext;

namespace QELO {

/// The front of one CGI invocation: reads the request from the CGI environment and standard
/// input, checks the caller, runs the API and prints headers and body to standard output.
///
///     int main(int argc, char** argv) {
///       QELO::WebEntry entry;
///       entry.SetArgs(argc, argv);
///       entry.Run(Json::Value());
///       return 0;
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
  /// Authenticates the caller of the process's own request and fills its session.
  /// @param allowTimeout  whether a timed-out session is accepted
  /// @return 0, or the web-API error code. Asked once per process and allowance.
  int CheckPermission(bool allowTimeout);

  /// Parameter intake. Each fills one JSON object with names and values.
  /// @return false when the input cannot be read; `params` or `section` then holds what had been
  ///         read so far.
  bool InitParam(Json::Value& params);
  bool InitGetParam(Json::Value& section);
  bool InitPostParam(Json::Value& section);
  bool LoadUploadAPIDesc(Json::Value& section);
  bool DetectAndDecryptParamLine(const std::string& line, Json::Value& section);
  bool DecryptParam(const std::string& text, Json::Value& section);
  bool DecryptAESParam(Json::Value& section);

  /// Print the response to standard output, whatever IsEnableOutput() says.
  void OutputHeader();
  void OutputBody();
  /// Forwards the request to the host that its parameter "relay_zt" names.
  /// @return whether the other host's answer was printed; else the response has the error
  bool ProcessRelay(APIRequest* request, APIResponse* response);

 private:
  QeloCgiContext* Context();
  bool GatherEnvironment();
  void Serve();
  bool RewriteCredentials();

  Json::Value spare_;                            ///< an array; not used
  alignas(void*) unsigned char cgiContext_[60];  ///< the CGI library's, see Context()
  Json::Value permission_;  ///< "permResult": authorisation results, by CheckPermission(bool)
};

/// After-output callback that restarts the web server; the argument is not used.
WEBAPI_API void RestartHttpd(void* unused);

}  // namespace QELO
