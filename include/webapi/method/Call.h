#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"

namespace QELO {

/// The call that a method serves: who calls, and the request and response for all else. Valid until
/// the method returns.
class Call {
 public:
  Call(APIRequest& request, APIResponse& response) : request_(&request), response_(&response) {}

  APIRequest& Request() const { return *request_; }
  APIResponse& Response() const { return *response_; }

  /// The caller's account; "" for nobody.
  std::string User() const { return request_->GetLoginUserName(); }
  bool IsAdmin() const { return request_->IsAdmin(); }
  /// A text of the API's own description, as the directory where its data stands: any member that
  /// the framework does not know. "" when there is none.
  std::string Setting(const std::string& name) const {
    return JsonHelper::asString(request_->GetAPIInfo(name));
  }
  /// Whether a parameter was sent, as null too.
  bool Has(const std::string& name) const { return request_->HasParam(name); }

 private:
  APIRequest* request_;
  APIResponse* response_;
};

}  // namespace QELO
