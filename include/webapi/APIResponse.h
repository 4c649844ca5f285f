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
/// A fresh response has the header "Content-type" for JSON, status 200 and an empty body.
class WEBAPI_API APIResponse {
 public:
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
  /// "errors" when `data` is null. Code 0 is success.
  void SetError(int code, const Json::Value& data = Json::Value());
  int GetError() const;         ///< the last code; 0 for success and when none was set
  Json::Value GetBody() const;  ///< an empty object when nothing was set

  bool HasHeader(const std::string& name) const;
  /// @return false when `name` is empty. A line that holds CR, LF or NUL is not sent.
  bool SetHeader(const std::string& name, const std::string& value);
  std::string GetHeader(const std::string& name, const std::string& def) const;
  Json::Value GetHeaders() const;
  Json::Value GetCookies() const;

  /// Adds one Set-Cookie line.
  /// @param name           letters, digits, '_' and '-' only
  /// @param value          plain; percent-encoded here
  /// @param expireMinutes  0: until the browser closes; negative: deletes the cookie; positive:
  ///                       minutes from the client's clock when the request has the parameter
  ///                       "client_time" (seconds since the epoch), else from ours
  /// @return false, and nothing is added, when name or path is empty, or the name holds another
  ///         character (logged). The same name twice gives two lines.
  bool AddCookie(const std::string& name, const std::string& value, const std::string& path = "/",
                 long expireMinutes = 0, const std::string& domain = "", bool secure = false,
                 bool httpOnly = false);

  /// @param message  kept, not sent: the status line's reason is the web server's
  bool SetStatus(_tag_HTTP_STATUS_CODE code, const std::string& message = "");
  int GetStatus() const;  ///< 200 when none was set
  /// Sends the client to `path` on the host that it called, with status 302.
  /// @return false without a request. An empty path throws std::out_of_range.
  bool Redirect(const std::string& path);

  /// Whether the framework prints headers and body; a method that printed its own says false.
  bool SetEnableOutput(bool enable);
  bool IsEnableOutput() const;
  /// Asks for a restart of the web server once the answer is sent.
  bool SetHttpdRestart(bool restart);
  bool GetHttpdRestart() const;
  /// A word for the web server and clients, sent as the header "x-request-error".
  void SetServerError(const std::string& word);
  std::string GetServerError() const;
  bool HasServerError() const;

  /// Registers work to do after the answer, in a background process about a second later. Null
  /// and a pair registered before are ignored; not available in the API daemon (logged).
  void SetCallbackFunc(CallbackFunc function, void* argument);
  void SetCallbackFuncs(CallbackList* callbacks);
  CallbackList* GetCallbackFuncs();

  /// The whole record; may be changed in place.
  Json::Value& Serialize();
  /// Swaps the whole record with `record`.
  void Deserialize(Json::Value& record);

 private:
  friend class APIPollingPrivate;  // asks what became of the last result

  std::unique_ptr<APIResponsePrivate> private_;
};

}  // namespace QELO
