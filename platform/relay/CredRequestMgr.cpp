#include "webapi/platform/CredRequest.h"

#include <algorithm>
#include <cstdlib>
#include <deque>
#include <string>
#include <utility>
#include <vector>

#include "platform/base/ModuleLoader.h"
#include "platform/relay/CallText.h"
#include "platform/relay/KnownHosts.h"
#include "platform/relay/RelayCall.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"

namespace QELO {
namespace {

using namespace Platform;

constexpr char kSource[] = "CredRequestMgr.cpp";
constexpr size_t kMostCalls = 16;
constexpr size_t kLongestHeader = 1024;  // bytes of a content type
constexpr char kPrivilege[] = "QELO.Relay.";
constexpr char kUserVariable[] = "QELO_WEBAPI_USERNAME";
constexpr char kRelayedVariable[] = "HTTP_X_QELO_RELAY";
constexpr char kRelayedLine[] = "X-Qelo-Relay: 1";
constexpr char kTokenHeader[] = "X-Qelo-Access-Token: ";
constexpr int kAddressSize = 65;

/// The call acts with the rights of this host's token there, so only those come by who may use it.
bool mayUse(long host) {
  const char* user = getenv(kUserVariable);
  char address[kAddressSize] = {};
  if (QeloCgiGetRemoteIP(address, kAddressSize) != 0) {
    address[0] = '\0';
  }
  return user != nullptr && *user != '\0' &&
         QLIBAppPrivUserHas(user, (kPrivilege + std::to_string(host)).c_str(), address) == 1;
}

bool isHeaderText(const std::string& text) {
  if (text.empty() || text.size() > kLongestHeader) {
    return false;
  }
  for (const char c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') {
      return false;
    }
  }
  return true;
}

}  // namespace

struct CredRequestMgrPrivate {
  std::vector<RelayCall> calls;
  std::deque<CredRequest> requests;  ///< one a call; they do not move
  std::vector<long> hosts;
  int error = CRED_REQUEST_OK;

  int Fail(long host, CredRequestError code, const std::string& reason) {
    WEBAPI_LOG(kSource, "no call of host %ld: %s", host, LogText(reason).c_str());
    error = code;
    return -1;
  }

  /// Whether the caller may be relayed there; fills in what the host's entry says.
  /// @return 0, or -1
  int Begin(long number, RelayCall& call) {
    RelayHost host;
    std::string reason;
    const char* relayed = getenv(kRelayedVariable);
    if (relayed != nullptr && *relayed != '\0') {
      return Fail(number, CRED_REQUEST_LOOP, "the call was relayed to here already");
    }
    if (calls.size() >= kMostCalls) {
      return Fail(number, CRED_REQUEST_TOO_LARGE, "too many calls at once");
    }
    if (!findRelayHost(number, host, reason)) {
      return Fail(number, CRED_REQUEST_NO_HOST, reason);
    }
    if (!mayUse(number)) {
      return Fail(number, CRED_REQUEST_FORBIDDEN,
                  "the caller lacks the privilege " + (kPrivilege + std::to_string(number)));
    }
    call.url = host.url;
    call.trust = host.trust;
    call.pin = host.pin;
    call.timeout = host.timeout;
    call.headers = {kRelayedLine, kTokenHeader + host.token};
    return 0;
  }

  int Add(long host, RelayCall call) {
    calls.push_back(std::move(call));
    requests.emplace_back();
    hosts.push_back(host);
    return static_cast<int>(calls.size() - 1);
  }
};

CredRequestMgr::CredRequestMgr() : private_(std::make_unique<CredRequestMgrPrivate>()) {}

CredRequestMgr::~CredRequestMgr() = default;

int CredRequestMgr::AddWebAPIRequest(long host, const std::string& api, int version,
                                     const std::string& method, const Json::Value& params) {
  RelayCall call;
  if (private_->Begin(host, call) != 0) {
    return -1;
  }
  if (!writeCall(api, version, method, params, kLongestCall, call.body)) {
    return private_->Fail(host, CRED_REQUEST_TOO_LARGE, "its parameters are too long");
  }
  call.headers.push_back("Content-Type: application/x-www-form-urlencoded");
  return private_->Add(host, std::move(call));
}

int CredRequestMgr::AddRelayRequest(long host, const std::string& api, int version,
                                    const std::string& method, const Json::Value& params,
                                    const Json::Value& headers, FILE* body, int) {
  RelayCall call;
  std::string line;
  if (private_->Begin(host, call) != 0) {
    return -1;
  }
  if (!writeCall(api, version, method, params, kLongestQuery, line)) {
    return private_->Fail(host, CRED_REQUEST_TOO_LARGE,
                          "an upload's parameters do not fit an address");
  }
  const std::string type = JsonHelper::asString(JsonHelper::member(headers, "Content-Type"));
  const std::string length = JsonHelper::asString(JsonHelper::member(headers, "Content-Length"));
  if (body == nullptr || !isHeaderText(type) || !ParseNumber(length, call.uploadLength) ||
      call.uploadLength < 0) {
    return private_->Fail(host, CRED_REQUEST_BAD_BODY, "the upload has no good length or type");
  }
  call.url += "?" + line;
  call.headers.push_back("Content-Type: " + type);
  call.upload = fileno(body);
  return private_->Add(host, std::move(call));
}

CredRequest* CredRequestMgr::GetRequest(int index) {
  return index >= 0 && static_cast<size_t>(index) < private_->requests.size()
             ? &private_->requests[static_cast<size_t>(index)]
             : nullptr;
}

bool CredRequestMgr::Run() {
  for (size_t i = 0; i < private_->calls.size(); ++i) {
    const long timeout = private_->requests[i].GetResponseTimeout();
    if (timeout > 0) {
      private_->calls[i].timeout = std::min(timeout, kLongestTimeout);
    }
  }
  private_->error = CRED_REQUEST_OK;
  if (private_->calls.empty()) {
    return true;
  }
  const auto run = reinterpret_cast<RelayRun>(findInModule(kRelayModule, kRelayRun));
  if (run == nullptr) {
    private_->error = CRED_REQUEST_NO_TRANSPORT;
    return false;
  }
  run(&private_->calls);
  for (size_t i = 0; i < private_->calls.size(); ++i) {
    if (private_->calls[i].error != CRED_REQUEST_OK) {
      private_->Fail(private_->hosts[i], private_->calls[i].error, private_->calls[i].reason);
    }
  }
  return private_->error == CRED_REQUEST_OK;
}

int CredRequestMgr::GetError() const {
  return private_->error;
}

const std::string& CredRequestMgr::GetResponse(int index) const {
  static const std::string none;
  return index >= 0 && static_cast<size_t>(index) < private_->calls.size()
             ? private_->calls[static_cast<size_t>(index)].answer
             : none;
}

}  // namespace QELO
