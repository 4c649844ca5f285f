#pragma once

#include <json/json.h>

#include <list>
#include <memory>
#include <string>
#include <utility>

#include "webapi/Export.h"
#include "webapi/HttpStatus.h"

namespace QELO {

class APIPollingPrivate;
class APIRequest;
class APIResponsePrivate;

/// The answer that an API method fills in.
///
/// A fresh response has the header "Content-type" for JSON, status 200 and an empty body. Setters
/// of headers and options say false, and nothing changes, only when the record was changed in place
/// and has no room for the value.
///
/// In the background process of a polling task, SetSuccess() and SetError() store the body as the
/// task's result each time; nothing else of the response reaches anybody.
class WEBAPI_API APIResponse {
 public:
  /// Work after the answer. It may throw: that is logged and ends this callback alone.
  using CallbackFunc = void (*)(void*);
  using CallbackList = std::list<std::pair<CallbackFunc, void*>>;

  /// @param request  the request that is answered, or null; must outlive the response
  explicit APIResponse(APIRequest* request);
  APIResponse(const APIResponse&) = delete;
  APIResponse& operator=(const APIResponse&) = delete;
  virtual ~APIResponse();

  /// The body becomes {"success": true, "data": data}, without "data" when that is null. Replaces
  /// whatever was set before.
  void SetSuccess(const Json::Value& data = Json::Value());
  /// The body becomes {"success": false, "error": {"code": code, "errors": data}}, without
  /// "errors" when `data` is null. Code 0 is success. Replaces whatever was set before.
  /// @param code  the API's own, from 400 on, or one of WebAPIError.h; the HTTP status stays 200
  void SetError(int code, const Json::Value& data = Json::Value());
  int GetError() const;         ///< the last code; 0 for success and when none was set
  Json::Value GetBody() const;  ///< an empty object when nothing was set

  /// Headers by name; "Status" is the status line. Capitals count, but for "Content-type", of which
  /// one is sent whatever its spelling.
  bool HasHeader(const std::string& name) const;
  /// Replaces the header of that very name.
  /// @return false when `name` is empty. A line that holds CR, LF or NUL, or a name with another
  ///         character than headers may have, is kept, but not sent (logged).
  bool SetHeader(const std::string& name, const std::string& value);
  std::string GetHeader(const std::string& name, const std::string& def) const;
  Json::Value GetHeaders() const;  ///< an object, name to text
  Json::Value GetCookies() const;  ///< an array of the texts behind "Set-Cookie: "

  /// Adds one Set-Cookie line.
  /// @param name           letters, digits, '_' and '-' only
  /// @param value          plain; percent-encoded here
  /// @param path           as it is sent
  /// @param expireMinutes  0: until the browser closes; negative: deletes the cookie; positive:
  ///                       minutes from the client's clock when the request has the parameter
  ///                       "client_time" (seconds since the epoch), else from ours
  /// @param domain         "": the host that was called alone
  /// @param secure         whether browsers send it by https alone
  /// @param httpOnly       whether browsers hide it from scripts
  /// @return false, and nothing is added, when name or path is empty, or the name holds another
  ///         character (logged). The same name twice gives two lines. A cookie whose path or domain
  ///         holds CR, LF or NUL is kept, but not sent (logged).
  bool AddCookie(const std::string& name, const std::string& value, const std::string& path = "/",
                 long expireMinutes = 0, const std::string& domain = "", bool secure = false,
                 bool httpOnly = false);

  /// Sets the HTTP status. The body stays, and goes along.
  /// @param message  kept, not sent: the status line's reason is the web server's
  bool SetStatus(_tag_HTTP_STATUS_CODE code, const std::string& message = "");
  int GetStatus() const;  ///< 200 when none was set, 0 when the header "Status" begins otherwise
  /// Sends the client to `path` on the host that it called, with status 302. "/" is put in front of
  /// a path that has none; the rest is taken as it is, so encode it.
  /// @return false without a request. An empty path throws std::out_of_range.
  bool Redirect(const std::string& path);

  /// Whether the framework prints headers and body; a method that printed its own says false. Only
  /// methods with "allowDownload" have the client at their standard output. Default: true.
  bool SetEnableOutput(bool enable);
  bool IsEnableOutput() const;
  /// Asks for a restart of the web server, a second after the answer is sent, with the rights that
  /// the process has then. They must allow to signal the server, so the method is "grantable" or
  /// "grantByDefault" and entry.cgi has root's rights; else nothing happens (logged). Default:
  /// false.
  bool SetHttpdRestart(bool restart);
  bool GetHttpdRestart() const;
  /// A word for the web server and clients, sent as the header "x-request-error". The permission
  /// check uses "noprivilege", "timeout", "unauth" and "errorip". Default: none.
  void SetServerError(const std::string& word);
  std::string GetServerError() const;
  bool HasServerError() const;

  /// Registers work to do after the answer, in a background process about a second later, one
  /// after the other. That is a fork: it sees memory as it was then, runs with the rights that the
  /// process has after the call, and has /dev/null as standard streams. Null and a pair registered
  /// before are ignored; not available in the API daemon (logged).
  /// @param argument  handed to `function`; the caller's, and valid until the process ends
  void SetCallbackFunc(CallbackFunc function, void* argument);
  /// Registers each of a list; null is ignored.
  void SetCallbackFuncs(CallbackList* callbacks);
  /// The response's own list, never null; may be changed.
  CallbackList* GetCallbackFuncs();

  /// The whole record but callbacks; may be changed in place.
  Json::Value& Serialize();
  /// Swaps the whole record with `record`.
  void Deserialize(Json::Value& record);

 private:
  friend class APIPollingPrivate;  // asks what became of the last result

  std::unique_ptr<APIResponsePrivate> private_;
};

}  // namespace QELO
