#pragma once

#include <json/json.h>

#include <cstdio>
#include <memory>
#include <string>

#include "webapi/Export.h"
#include "webapi/platform/CredRequestError.h"

/// The host's credential library: calls of other hosts of the same kind, in this one's name.
namespace QELO {

struct CredRequestMgrPrivate;

/// One queued call.
class WEBAPI_API CredRequest {
 public:
  /// How long the answer may take once the request is sent.
  /// @param seconds  0 or less: the manager's default
  void SetResponseTimeout(long seconds) { responseTimeout_ = seconds; }
  long GetResponseTimeout() const { return responseTimeout_; }

 private:
  long responseTimeout_ = 0;
};

/// Queues calls of other hosts, performs them at once and keeps their answers. The user whom the
/// calls are made for is the one that the environment variable QELO_WEBAPI_USERNAME names.
class WEBAPI_API CredRequestMgr {
 public:
  CredRequestMgr();
  CredRequestMgr(const CredRequestMgr&) = delete;
  CredRequestMgr& operator=(const CredRequestMgr&) = delete;
  ~CredRequestMgr();

  /// Queues one web-API call.
  /// @param host    the other host's number
  /// @param params  an object; credentials among them stay here
  /// @return the call's index; a negative value on failure, see GetError()
  int AddWebAPIRequest(long host, const std::string& api, int version, const std::string& method,
                       const Json::Value& params);
  /// The same for an upload, whose body is passed on as it comes.
  /// @param headers   "Content-Type" and "Content-Length" of the body, as texts
  /// @param body      read from its descriptor during Run(); what the stream itself has read before
  ///                  is not sent
  /// @param reserved  0
  int AddRelayRequest(long host, const std::string& api, int version, const std::string& method,
                      const Json::Value& params, const Json::Value& headers, FILE* body,
                      int reserved);
  /// @param index  of a queued call; null for any other
  CredRequest* GetRequest(int index);
  /// Performs what is queued, all at once. @return false when one of them failed
  bool Run();
  /// Why the last operation failed: a CredRequestError.
  int GetError() const;
  /// The answer's body as it came; "" before Run() and for no queued call.
  const std::string& GetResponse(int index) const;

 private:
  std::unique_ptr<CredRequestMgrPrivate> private_;
};

}  // namespace QELO
