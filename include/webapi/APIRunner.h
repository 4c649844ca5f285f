#pragma once

#include <json/json.h>

#include <map>
#include <memory>
#include <string>

#include "webapi/APITable.h"
#include "webapi/Export.h"

namespace QELO {

class APIRequest;
class APIResponse;
class APIRunnerPrivate;
class ExecParam;

/// The engine that turns one prepared request into one API call.
///
/// One runner serves one process: build it before the request is read, destroy it after the
/// answer is written. It changes the process it runs in: session, name, syslog identity, and for
/// a call credentials, priority, standard streams and working directory. Single-threaded.
///
/// APIs are looked up in description files of the current working directory.
class WEBAPI_API APIRunner {
 public:
  /// Detaches from the terminal's session and reads the descriptions' defaults.
  APIRunner();
  APIRunner(const APIRunner&) = delete;
  APIRunner& operator=(const APIRunner&) = delete;
  /// Closes the API libraries and gives the process its name back.
  virtual ~APIRunner();

  /// Runs one request given as an object with "getParam", "postParam", "environ", "session" and
  /// "attr". The answer is in GetResponse().
  /// @return whether the call was made
  virtual bool Run(const Json::Value& param);
  /// Whether a daemon serves the request.
  virtual bool CanProcessSocket(APIRequest* request);
  /// Prepares the runner's request. @return false with the response's error set
  virtual bool Initialize(const Json::Value& param);

  /// Permission and upload hooks; IsPermitted() says in which order they are asked. Here they let
  /// every request pass: true, false, true, true, true.
  virtual bool CheckSharingPermission(APIRequest* request, APIResponse* response);
  virtual bool NeedPermission(APIRequest* request);
  virtual bool CheckPermission(APIRequest* request, APIResponse* response);
  virtual bool HandleUpload(APIRequest* request, APIResponse* response);
  virtual bool SkipPermission(APIRequest* request);

  /// Checks a request and runs it: as a compound request, through a daemon, or in process.
  /// @return whether the call was made; else the response has the error
  bool Process(APIRequest* request, APIResponse* response);
  /// Calls an API as a given user, for programs that are not serving a request: no permission is
  /// checked, so the caller answers for the user. Working directory, environment and process name
  /// change for the time of the call. Callbacks that the method registers are not run.
  /// @return the answer's body with "httpd_restart", or {"success": false, "error": {"code"}} with
  ///         101 when API, method or user is missing and 117 when a child process came to nothing
  static Json::Value Exec(const ExecParam& param);
  /// @param result    receives the answer
  /// @param outputFd  receives the body of what a downloading method prints; below 0: none
  /// @param params, attributes  objects, or null
  static void Exec(Json::Value& result, int outputFd, const char* api, int version,
                   const char* method, const Json::Value& params, const Json::Value& attributes,
                   const char* runner);
  static void Exec(Json::Value& result, const char* api, int version, const char* method,
                   const Json::Value& params, const Json::Value& attributes, const char* runner);
  static void Exec(Json::Value& result, const char* api, int version, const char* method,
                   const Json::Value& params, const char* runner);
  /// The answer's body with "httpd_restart" added; null without a response.
  Json::Value GetResponse() const;
  /// Hands over main()'s arguments, whose area shows the process name.
  void SetArgs(int argc, char** argv);
  /// Names process, thread and syslog identity after the request's call.
  bool SetProcessName(APIRequest* request, APIResponse* response);
  /// Runs the response's callbacks in a background process, a second later.
  bool HandleCallback(APIResponse* response);

  /// Whether a description is usable: "lib", "minVersion", "maxVersion", "methods" of the right
  /// types, and "priority", if any, from -10 to 10.
  bool CheckLibDescription(const Json::Value& description) const;
  /// Fills the defaults into a description and returns it.
  Json::Value& ApplyLibDef(Json::Value& description) const;
  /// Loads every description file of the working directory. @return false when there is none
  bool InitLibDesc(Json::Value& catalogue);
  /// Makes sure that the API's description file is loaded. @return false when no usable file is
  /// found; true does not yet mean that the file describes the API.
  bool InitLibDesc(Json::Value& catalogue, const std::string& api);
  bool InitLibDesc(Json::Value& catalogue, APIRequest* request);
  /// Hands the loaded description to the request. Loads nothing.
  bool AddAPIInfo(APIRequest* request);
  /// The method's attributes, or the defaults when it has none of its own. Valid until the next
  /// call that loads descriptions.
  const Json::Value& GetMethod(const std::string& api, int version, const std::string& method);
  bool GetMethodAttr(const std::string& api, int version, const std::string& method,
                     const std::string& attribute);
  bool GetMethodAttr(APIRequest* request, const std::string& attribute);
  /// Sets 101 to 104, 115 or 116 when the request cannot be run.
  bool CheckRequestParam(APIRequest* request, APIResponse* response);

  /// Opens the request's API library and asks it for its tables.
  /// @param checkTable  may be null; left as it is when the library has no such table
  bool OpenLib(APIRequest* request, _tag_API_TABLE** table, _tag_API_CHECK_TABLE** checkTable);
  /// Opens the request's API library once. The handle stays the runner's.
  bool CacheLib(APIRequest* request, void** handle);

 protected:
  APIRequest* Request() const { return request_.get(); }
  APIResponse* Response() const { return response_.get(); }

  /// Adds the process environment to the object `env`. @return false with error 101 set when it
  /// is no object
  bool InitEnv(Json::Value& env);
  bool ProcessEntry(APIRequest* request, APIResponse* response);
  bool HandleCompound(APIRequest* request, APIResponse* response);
  /// How many compound requests are being handled, one within the other; 0 outside of them.
  int CompoundDepth() const { return compoundDepth_; }
  bool ProcessSocket(APIRequest* request, APIResponse* response);
  bool ProcessLib(APIRequest* request, APIResponse* response);
  /// Asks the permission hooks in their order. @return whether the call may go on
  bool IsPermitted(APIRequest* request, APIResponse* response);
  void IncreaseCounter(APIRequest* request);
  bool GetTableFunc(void* handle, _tag_API_TABLE** table);
  bool GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable);
  void CloseLib();

 private:
  struct Rooms;

  Json::Value libDef;
  Json::Value catalogue;
  std::unique_ptr<APIRequest> request_;
  std::unique_ptr<APIResponse> response_;
  std::map<std::string, void*> libraries_;
  int compoundDepth_ = 0;
  std::unique_ptr<APIRunnerPrivate> private_;
  std::unique_ptr<Rooms> rooms_;  ///< what works on the members above
};

}  // namespace QELO
