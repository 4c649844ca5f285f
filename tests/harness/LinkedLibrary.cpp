// The API library of a test program: its own code, whatever path the description names.

#include <dlfcn.h>

#include "webapi/base/MemoryBound.h"
#include "webapi/runner/library/LoadLibrary.h"

namespace QELO {

void* LoadLibrary(const std::string&, std::string& error) {
  MemoryBound::Lift();
  void* program = dlopen(nullptr, RTLD_LAZY);
  const char* reason = program == nullptr ? dlerror() : nullptr;
  error = reason != nullptr ? reason : "";
  return program;
}

}  // namespace QELO
