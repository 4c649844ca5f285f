#include "webapi/SharingChecker.h"

namespace QELO {

bool SharingChecker::Run(const Json::Value&) {
  return Initialize(Json::Value()) && CheckSharingAppPermission(Request(), Response());
}

}  // namespace QELO
