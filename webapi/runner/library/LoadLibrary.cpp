#include "webapi/runner/library/LoadLibrary.h"

#include <dlfcn.h>

#include "webapi/base/MemoryBound.h"
#include "webapi/base/OwnFile.h"
#include "webapi/runner/library/PreloadedLibraries.h"

namespace QELO {
namespace {

/// The process ends here at an exception. It would not everywhere if dlopen() were called by its
/// name, since that is declared not to throw and what then happens is up to the optimiser.
void* load(const std::string& path) noexcept {
  void* (*volatile open)(const char*, int) = dlopen;
  return open(path.c_str(), RTLD_LAZY);
}

}  // namespace

void* LoadLibrary(const std::string& path, std::string& error) {
  // A name without a directory is looked for where the system keeps its own.
  if (path.find('/') != std::string::npos && OthersMayChange(path)) {
    error = "others may write it or its directory";
    return nullptr;
  }
  MemoryBound::Lift();
  void* opened = PreloadedLibraries::Find(path);
  if (opened == nullptr) {
    opened = load(path);
  }
  if (opened == nullptr) {
    const char* reason = dlerror();
    error = reason != nullptr ? reason : "";
  }
  return opened;
}

}  // namespace QELO
