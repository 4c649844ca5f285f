#include "webapi/platform/Core.h"

namespace {

int lastError = 0;

}  // namespace

extern "C" {

void QLIBCErrSetEx(int error, const char*, int) {
  lastError = error;
}

int QLIBCErrGet(void) {
  return lastError;
}

}  // extern "C"
