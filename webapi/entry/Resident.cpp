// The web entry in a process that lives on.

#include "webapi/WebEntry.h"
#include "webapi/base/TakenBody.h"
#include "webapi/entry/ProcessGuard.h"
#include "webapi/platform/Core.h"

namespace QELO {

void WebEntry::RunBy(CallRoad& road) {
  // What the request before has left.
  QLIBCErrSetEx(0, "WebEntry.cpp", __LINE__);
  TakenBodyBytes() = 0;
  CleanEnvironment();
  SetRoad(&road);
  ServeAndAnswer();
  SetRoad(nullptr);
}

}  // namespace QELO
