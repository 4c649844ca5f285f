#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/APIRunner.h"
#include "webapi/Export.h"

struct QeloCgiContext;

namespace QELO {

class LinkCheck;
class PermissionCheck;

/// The front of one CGI invocation: reads the request from the CGI environment and standard
/// input, checks the caller, runs the API and prints headers and body to standard output.
///
///     int main(int argc, char** argv) {
///       QELO::WebEntry::GuardProcess();
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

  /// Takes nothing on trust from who started the process, for a program that may be set-user-id:
  /// closes all descriptors but the standard ones, fixes PATH, and drops of the environment what no
  /// CGI program needs (docs/architecture.md). Call it first.
  static void GuardProcess();

  /// Serves the request: intake, call, output, callbacks. The argument is not consulted. An
  /// exception on the way to the answer is logged and answered with 117.
  /// @return whether callbacks were started. What became of the request is in the answer.
  bool Run(const Json::Value& param) override;
  /// Serves the request as Run() does, in a process that lives on: what of the caller's environment
  /// is of no use is dropped, the call is made by the road, and callbacks are whose call it was. A
  /// request that the road leaves is not answered. The environment stays as the request has left
  /// it.
  void RunBy(CallRoad& road);
  /// Takes the request in: CGI environment, query and body, and credentials among the parameters,
  /// which replace those of cookies and headers. The argument is not consulted.
  /// @return false with error 101 when the query or the body cannot be read, or 117 (for an access
  ///         token no error) when credentials cannot be put into the environment
  bool Initialize(const Json::Value& param) override;
  /// Whether the sharing link that the request came by allows the call: the method takes links, the
  /// visitor may use this one, and the link's application lets the call pass. The session of
  /// `request` is from then on that of the link's owner, where the link says so, else nobody's; its
  /// result is in GetAuthResult().
  /// @return false with 101, 122 to 127 or 150 set; with null arguments without
  bool CheckSharingPermission(APIRequest* request, APIResponse* response) override;
  /// Whether the API's "authLevel" asks for a check: all but 0 do, a missing one too.
  bool NeedPermission(APIRequest* request) override;
  /// Checks who calls (session, else access token), the user class, then the application
  /// privilege. The caller found is the session of `request` from then on; one that was refused
  /// leaves an inner request without a user.
  /// @return false with 105, 106, 119, 150 or 160 set, and for all but the class and the privilege
  ///         a server error; with null arguments without
  bool CheckPermission(APIRequest* request, APIResponse* response) override;
  /// Takes the upload in: its fields become parameters of the request, and its files are there as
  /// APIUpload::GetFiles() tells. The call stays the one that was checked. The upload of a method
  /// with "deferUpload", which reads it itself, is left alone.
  /// @return false with error 108 and {"upload_err": an APIUpload::Result}
  bool HandleUpload(APIRequest* request, APIResponse* response) override;
  /// Whether the method runs in spite of what the check found: "authLevel" 2.
  bool SkipPermission(APIRequest* request) override;

 protected:
  /// Authenticates the caller of the process's own request and fills its session.
  /// @param allowTimeout  whether a timed-out session is accepted
  /// @return 0, or the web-API error code: 105, 106, 119 or 150. Asked once for each of the two
  ///         allowances and kept for the life of the process.
  int CheckPermission(bool allowTimeout);

  /// Makes the owner of the link the caller: session data of `request`, and QELO_WEBAPI_USERNAME.
  void InitSharingSession(APIRequest* request);
  /// Asks the sharing check library of the link's application, with the credentials of its file's
  /// owner and standard streams shut.
  /// @return false when it refuses the call, or cannot be asked (logged)
  bool CheckSharingAppPermission(APIRequest* request, APIResponse* response);
  /// Where that library stands; "" when the link's project cannot be the name of one.
  std::string GetSharingCheckLibPath(APIRequest* request);
  /// Opens the library, once for each path and for the life of the process, and asks for its table.
  /// @return false, with the reason logged, without a table
  bool OpenSharingCheckLib(APIRequest* request, _tag_API_SHARING_CHECK_TABLE** table);
  bool GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table);
  /// Finds the check for the request's call.
  /// @param check  receives the check of the first entry that fits
  bool GetSharingCheckFunc(APIRequest* request, _tag_API_SHARING_CHECK_TABLE* table,
                           bool (**check)(APIRequest*, APIResponse*));
  /// 0 when a POSIX extended regular expression matches somewhere in the subject, or is "*"; else
  /// what the host's regcomp() or regexec() says.
  static int RegexMatch(const char* pattern, const char* subject);

  /// Parameter intake. Each fills one JSON object with names and values.
  /// @return false when the input cannot be read; `params` or `section` then holds what had been
  ///         read so far. Initialize() answers 101 then.
  ///
  /// Query and body, as the members "getParam" and "postParam" of `params`. The body is read for
  /// POST alone, and not when an upload's query names the whole call: then it is the method's.
  bool InitParam(Json::Value& params);
  /// The query. One that is no text cannot be read.
  bool InitGetParam(Json::Value& section);
  /// The body, as a parameter line whatever its type. It has to announce its length, hold 16 MiB at
  /// most and not be empty; standard input leads to /dev/null afterwards. What is sent too slowly
  /// is taken as far as it came.
  bool InitPostParam(Json::Value& section);
  /// The call of an upload whose query does not name it: the fields in front of its first file. The
  /// request's CONTENT_LENGTH is that of the rest from then on.
  bool LoadUploadAPIDesc(Json::Value& section);
  /// A parameter line, "a=1&b=2", up to its first NUL: deciphered when it is enciphered, then the
  /// two envelopes of enciphered parameters opened. An inner one that cannot be is left out.
  bool DetectAndDecryptParamLine(const std::string& line, Json::Value& section);
  /// Opens an envelope of the platform's own cipher, and an AES one within it, into `section`.
  bool DecryptParam(const std::string& text, Json::Value& section);
  /// Opens the section's AES envelope, whose members are gone afterwards; true when it has none.
  bool DecryptAESParam(Json::Value& section);

  /// From here on errors are told by the HTTP status, too: for programs whose clients go by it.
  void TellErrorsByStatus() { tellsStatus_ = true; }
  /// Print the response to standard output, whatever IsEnableOutput() says: header lines, cookies
  /// and those that go with every answer; then the body as JSON, bytes that are no UTF-8 replaced.
  /// A client that is gone is no failure.
  void OutputHeader();
  void OutputBody();
  /// Forwards the call to the host whose number its parameter "relay_zt" is, and prints that host's
  /// answer behind the response's own header lines. The caller has to be logged in, or to have an
  /// access token for the call; what else the API asks of its callers is the other host's to check.
  /// @return whether the other host's answer was printed, and the response's output switched off;
  ///         else the response has the error: of a check, or 109
  bool ProcessRelay(APIRequest* request, APIResponse* response);

 private:
  QeloCgiContext* Context();
  LinkCheck& Links();
  bool GatherEnvironment();
  void Serve();
  void ServeAndAnswer();
  bool RewriteCredentials();
  void RemoveUpload();

  Json::Value temporaryFiles_;                   ///< paths of the upload's files, a list
  alignas(void*) unsigned char cgiContext_[60];  ///< the CGI library's, see Context()
  Json::Value permission_;    ///< "permResult": authorisation results, by CheckPermission(bool)
  bool hasUpload_ = false;    ///< there may be temporary files
  bool tellsStatus_ = false;  ///< errors have an HTTP status
  std::unique_ptr<PermissionCheck> check_;  ///< over the members above
  std::unique_ptr<LinkCheck> links_;        ///< likewise; made by the first call by a link
};

/// After-output callback that restarts the web server; the argument is not used. Throws when the
/// settings do not name the server's process; one that cannot be signalled is logged.
WEBAPI_API void RestartHttpd(void* unused);

}  // namespace QELO
