// Calls of other hosts, which go nowhere: each step answers what the fake platform's fields say.

#include <unistd.h>

#include "tests/support/FakePlatform.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/CredRequest.h"

namespace QELO {
namespace {

FakePlatform& fake() {
  return FakePlatform::Get();
}

std::string textOf(long host, const std::string& api, int version, const std::string& method,
                   const Json::Value& params) {
  return std::to_string(host) + ", " + api + ", " + std::to_string(version) + ", " + method + ", " +
         JsonHelper::toString(params);
}

}  // namespace

struct CredRequestMgrPrivate {
  CredRequest request;
  bool isQueued = false;
  bool hasRun = false;
};

CredRequestMgr::CredRequestMgr() : private_(std::make_unique<CredRequestMgrPrivate>()) {
  fake().calls.push_back("CredRequestMgr()");
}

CredRequestMgr::~CredRequestMgr() {
  fake().calls.push_back("~CredRequestMgr()");
}

int CredRequestMgr::AddWebAPIRequest(long host, const std::string& api, int version,
                                     const std::string& method, const Json::Value& params) {
  fake().calls.push_back("AddWebAPIRequest(" + textOf(host, api, version, method, params) + ")");
  private_->isQueued = fake().relayIndex >= 0;
  return fake().relayIndex;
}

int CredRequestMgr::AddRelayRequest(long host, const std::string& api, int version,
                                    const std::string& method, const Json::Value& params,
                                    const Json::Value& headers, FILE* body, int reserved) {
  fake().calls.push_back("AddRelayRequest(" + textOf(host, api, version, method, params) + ", " +
                         JsonHelper::toString(headers) + ", " + std::to_string(fileno(body)) +
                         ", " + std::to_string(reserved) + ")");
  private_->isQueued = fake().relayIndex >= 0;
  char buffer[4096];
  ssize_t count = 0;
  while (private_->isQueued && (count = read(fileno(body), buffer, sizeof buffer)) > 0) {
    fake().relayBody.append(buffer, static_cast<size_t>(count));
  }
  return fake().relayIndex;
}

CredRequest* CredRequestMgr::GetRequest(int index) {
  fake().calls.push_back("GetRequest(" + std::to_string(index) + ")");
  return private_->isQueued && index == fake().relayIndex ? &private_->request : nullptr;
}

bool CredRequestMgr::Run() {
  fake().calls.push_back("Run(" + std::to_string(private_->request.GetResponseTimeout()) + ")");
  private_->hasRun = fake().relayRuns;
  return fake().relayRuns;
}

int CredRequestMgr::GetError() const {
  return fake().relayError;
}

const std::string& CredRequestMgr::GetResponse(int index) const {
  static const std::string none;
  return private_->hasRun && index == fake().relayIndex ? fake().relayAnswer : none;
}

}  // namespace QELO
