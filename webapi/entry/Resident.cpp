// The web entry in a process that lives on.

#include "webapi/WebEntry.h"
#include "webapi/entry/ProcessGuard.h"
#include "webapi/platform/Core.h"

namespace QELO {

void WebEntry::RunBy(CallRoad& road) {
  QLIBCErrSetEx(0, "WebEntry.cpp", __LINE__);  // of the request before
  CleanEnvironment();
  SetRoad(&road);
  ServeAndAnswer();
  SetRoad(nullptr);
}

}  // namespace QELO
