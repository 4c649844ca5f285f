#include "tests/unit/entry/FailingSetenv.h"

#include <dlfcn.h>

#include <cerrno>
#include <cstring>

namespace {

const char* failingName = nullptr;

}  // namespace

FailingSetenv::FailingSetenv(const char* name) {
  failingName = name;
}

FailingSetenv::~FailingSetenv() {
  failingName = nullptr;
}

// Takes the place of the C library's for the whole test program, and calls it.
extern "C" __attribute__((visibility("default"))) int setenv(const char* name, const char* value,
                                                             int overwrite) noexcept {
  using Setenv = int (*)(const char*, const char*, int);
  static const Setenv real = reinterpret_cast<Setenv>(dlsym(RTLD_NEXT, "setenv"));
  if (failingName != nullptr && strcmp(name, failingName) == 0) {
    errno = ENOMEM;
    return -1;
  }
  return real(name, value, overwrite);
}
