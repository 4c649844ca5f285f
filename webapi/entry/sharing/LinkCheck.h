#pragma once

#include <string>

#include "webapi/APIRequest.h"
#include "webapi/entry/sharing/CheckLibraries.h"

struct QeloCgiContext;

namespace QELO {

class APIResponse;
class APIRunner;

/// Whether a visitor may make a call by a sharing link. The operations are WebEntry's of the same
/// name.
class LinkCheck {
 public:
  /// @param runner   knows the methods' attributes
  /// @param context  the CGI library's
  LinkCheck(APIRunner& runner, QeloCgiContext* context) : runner_(runner), context_(context) {}
  LinkCheck(const LinkCheck&) = delete;
  LinkCheck& operator=(const LinkCheck&) = delete;

  bool CheckSharingPermission(APIRequest* request, APIResponse* response);
  void InitSharingSession(APIRequest* request);
  bool CheckSharingAppPermission(APIRequest* request, APIResponse* response);
  CheckLibraries& Libraries() { return libraries_; }

 private:
  static bool Refuse(APIRequest& request, APIResponse& response, int code, const char* reason);

  APIRunner& runner_;
  QeloCgiContext* context_;
  CheckLibraries libraries_;
};

}  // namespace QELO
