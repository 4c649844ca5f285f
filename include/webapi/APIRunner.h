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
class CallRoad;
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
  /// "attr", each optional. The answer is in GetResponse(); callbacks are left to HandleCallback().
  /// @return whether the call was made, whatever its answer; else the response has the error: 101
  ///         for null, an empty object, a missing API and "relay_zt", 118 when the process cannot
  ///         be named, those of CheckRequestParam()
  virtual bool Run(const Json::Value& param);
  /// Whether the request goes to an API daemon: its description names a "socket" that is there, and
  /// neither turns that off nor has the method send a file or read its upload itself. Never within
  /// a daemon, that is with "in_qeloapid" in the process environment.
  virtual bool CanProcessSocket(APIRequest* request);
  /// Prepares the runner's request: the process environment, what `param` has in "environ",
  /// "session" and "attr", then its parameters.
  /// @return false with error 101 when there is nothing in `param`
  virtual bool Initialize(const Json::Value& param);

  /// Permission and upload hooks; IsPermitted() says in which order they are asked. Here they let
  /// every request pass: true, false, true, true, true.
  virtual bool CheckSharingPermission(APIRequest* request, APIResponse* response);
  virtual bool NeedPermission(APIRequest* request);
  virtual bool CheckPermission(APIRequest* request, APIResponse* response);
  virtual bool HandleUpload(APIRequest* request, APIResponse* response);
  virtual bool SkipPermission(APIRequest* request);

  /// Checks a request and runs it: as a compound request, through a daemon, or in process. Names
  /// the process after the call before, and again afterwards, since an inner call has names of its
  /// own.
  /// @return whether the call was made and the method returned, whatever its answer; else the
  ///         response has the error: those of CheckRequestParam(), 109, 110, 111, 117, 118, 121,
  ///         or the one of the hook or check function that refused it
  bool Process(APIRequest* request, APIResponse* response);
  /// Calls an API as a given user, for programs that are not serving a request: no permission is
  /// checked, so the caller answers for the user. Working directory, environment and process name
  /// change for the time of the call. Callbacks that the method registers are not run.
  /// @return the answer's body with "httpd_restart", or {"success": false, "error": {"code"}} with
  ///         101 when API, method or user is missing and 117 when a child process came to nothing
  static Json::Value Exec(const ExecParam& param);
  /// As Exec(ExecParam). A text that is null counts as "".
  /// @param result    receives the answer
  /// @param outputFd  receives the body of what a downloading method prints; below 0: none
  /// @param params, attributes  objects, or null for none
  /// @param runner    the user to run as
  static void Exec(Json::Value& result, int outputFd, const char* api, int version,
                   const char* method, const Json::Value& params, const Json::Value& attributes,
                   const char* runner);
  static void Exec(Json::Value& result, const char* api, int version, const char* method,
                   const Json::Value& params, const Json::Value& attributes, const char* runner);
  static void Exec(Json::Value& result, const char* api, int version, const char* method,
                   const Json::Value& params, const char* runner);
  /// The answer's body with "httpd_restart" (bool) added.
  Json::Value GetResponse() const;
  /// Hands over main()'s arguments, whose area shows the process name: no more of it than the first
  /// argument had room for. Without them the name is kept from `ps`. Not copied, and written to
  /// until the runner is destroyed.
  void SetArgs(int argc, char** argv);
  /// Names process, thread and syslog identity after the request's call, as
  /// "entry.cgi_QELO.Host.Info_1_get": 1023 bytes at most for the identity, with control characters
  /// as "?", and 15 of the call for the thread.
  /// @return false, with error 101 without an API's name and 118 when the system refuses (logged)
  bool SetProcessName(APIRequest* request, APIResponse* response);
  /// Runs the response's callbacks in a background process, a second later; see
  /// APIResponse::SetCallbackFunc().
  /// @return false without callbacks, and when the process could not be made
  bool HandleCallback(APIResponse* response);

  /// Whether a description is usable: "lib", "minVersion", "maxVersion", "methods" of the right
  /// types, and "priority", if any, from -10 to 10.
  bool CheckLibDescription(const Json::Value& description) const;
  /// Fills the defaults into a description and returns it: "authLevel", "allowUser" and "priority"
  /// of lib.def (null where it has none) and "requestFormat" "JSON", each where it is missing. What
  /// takes no members is returned as it is.
  Json::Value& ApplyLibDef(Json::Value& description) const;
  /// Loads every description file of the working directory into `catalogue`, an object of API names
  /// to descriptions, or null. One that is no usable description is left out (logged), a file that
  /// cannot be read too. @return false when there is no file
  bool InitLibDesc(Json::Value& catalogue);
  /// Makes sure that the API's description file is loaded: of the first four of QELO.A.lib,
  /// QELO.A.B.lib, ... the longest that exists. An API that `catalogue` has is not looked up again.
  /// @return false when there is no such file or it is not JSON (logged); true does not yet mean
  ///         that the file describes the API
  bool InitLibDesc(Json::Value& catalogue, const std::string& api);
  bool InitLibDesc(Json::Value& catalogue, APIRequest* request);
  /// Hands the loaded description to the request. Loads nothing. @return false when there is none
  bool AddAPIInfo(APIRequest* request);
  /// The method's attributes as its description has them, of whatever type, or "methods" of lib.def
  /// when it has none of its own; null without that. Loads the API's description. Valid until the
  /// next call that loads descriptions.
  const Json::Value& GetMethod(const std::string& api, int version, const std::string& method);
  /// Whether an attribute of the method is set: true, or a number other than 0. Attributes that are
  /// no object are those of lib.def. False for what is missing or of another type.
  bool GetMethodAttr(const std::string& api, int version, const std::string& method,
                     const std::string& attribute);
  bool GetMethodAttr(APIRequest* request, const std::string& attribute);
  /// Whether the request names a call that there is. Loads the API's description, once a runner.
  /// @return false with 101 (no API, method, or a version below 1), 102 (no description), 104
  ///         (version out of range), 103 (method not listed), 115 (an upload that the method does
  ///         not take) or 116 set
  bool CheckRequestParam(APIRequest* request, APIResponse* response);

  /// Opens the request's API library and asks it for its tables, each time.
  /// @param table       receives the library's own table; null, or as it was, on failure
  /// @param checkTable  may be null; left as it is when the library has no such function, and null
  ///                    when that gives none
  /// @return false, with the reason logged, without a table of methods
  bool OpenLib(APIRequest* request, _tag_API_TABLE** table, _tag_API_CHECK_TABLE** checkTable);
  /// Opens the request's API library, once for each path. The handle stays the runner's, which
  /// closes it when it is destroyed.
  /// @return false, with the reason logged and `handle` as it was, when the description names no
  ///         library or the loader refuses it
  bool CacheLib(APIRequest* request, void** handle);

  /// Loads an API library for the runners of processes that are forked from here on, as a copy that
  /// nobody can change. A runner uses it while the file is what it was, and closes it in the end;
  /// so only one runner of a process has it.
  /// @param path  as descriptions name it, with a "/"
  /// @return false, with the reason logged, when it was not loaded: runners load it themselves then
  static bool PreloadLibrary(const std::string& path);
  /// Loads those anew whose files are others by now. To be called every second or so: what the
  /// process has in memory is measured, too, for those that are forked.
  static void RefreshLibraries();

 protected:
  APIRequest* Request() const { return request_.get(); }
  APIResponse* Response() const { return response_.get(); }

  /// Adds the process environment to the object `env`. @return false with error 101 set when it
  /// is no object
  bool InitEnv(Json::Value& env);
  /// The three roads of Process(), and what they return is what it returns.
  ///
  /// ProcessEntry() runs a compound request: 110 without the parameter "compound".
  bool ProcessEntry(APIRequest* request, APIResponse* response);
  /// Hands the request to a CompoundHandler of its own.
  bool HandleCompound(APIRequest* request, APIResponse* response);
  /// How many compound requests are being handled, one within the other; 0 outside of them.
  int CompoundDepth() const { return compoundDepth_; }
  /// Has a daemon make the call: permission and upload here, then request and response go to it as
  /// one message, and its response takes the place of `response`.
  /// @return false with what the hooks have set, or with error 117 (logged) when the daemon could
  /// not
  ///         be asked or gave no answer; the call is not made in this process then
  bool ProcessSocket(APIRequest* request, APIResponse* response);
  /// Runs the method in this process: permission, count, upload, then with standard streams shut,
  /// priority and credentials as the description wants them. All are given back but the credentials
  /// of a method without "grantable" and "grantByDefault", which cannot be.
  bool ProcessLib(APIRequest* request, APIResponse* response);
  /// Has the calls of Process() go by another road than this process: what the road does not take
  /// is left alone, and a call that it takes is permitted here and made there.
  /// @param road  lives as long as the runner; null: as ever
  void SetRoad(CallRoad* road);
  CallRoad* Road() const;
  /// Makes a call that another process has checked and permitted, in this one, which has the
  /// account and the priority of the method already and keeps them. Directory, streams and name are
  /// given back.
  /// @return as ProcessLib()
  bool ProcessPermitted(APIRequest* request, APIResponse* response);
  /// Asks the permission hooks in their order: CheckSharingPermission() for a request by a sharing
  /// link, for all others CheckPermission() when NeedPermission() says so; and what they refuse
  /// passes all the same when SkipPermission() says so. @return whether the call may go on
  bool IsPermitted(APIRequest* request, APIResponse* response);
  /// Takes the upload that the request may be. @return false when it is one, and the method takes
  /// none or HandleUpload() fails
  bool TakeUpload(APIRequest* request, APIResponse* response, const Json::Value& attributes);
  /// Adds one to the call's usage count. A count that cannot be stored is lost in silence.
  void IncreaseCounter(APIRequest* request);
  /// Ask a library for one table each.
  /// @return false, with the reason logged, when it gives none. For the check table also when
  ///         `handle` or `checkTable` is null; a library without the function is no failure, and
  ///         leaves `checkTable` as it was.
  bool GetTableFunc(void* handle, _tag_API_TABLE** table);
  bool GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable);
  /// Closes all libraries: no table or function of theirs may be used any more.
  void CloseLib();

 private:
  friend class ExecHandler;  ///< closes the libraries of its call with the streams shut
  struct Rooms;

  bool TakesRoad(APIRequest* request);
  bool RunByRoad(APIRequest* request, APIResponse* response, const Json::Value& attributes);
  void CountCall(APIRequest* request, const Json::Value& attributes);

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
