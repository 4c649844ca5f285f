#include "tests/unit/model/FailingLibc.h"

#include <dlfcn.h>
#include <regex.h>

namespace {

FailingLibc* current = nullptr;

template <typename Function>
Function real(const char* name) {
  return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

}  // namespace

FailingLibc::FailingLibc() {
  current = this;
}

FailingLibc::~FailingLibc() {
  current = nullptr;
}

// These take the place of the C library's for the whole test program, and call them.
extern "C" {

__attribute__((visibility("default"))) int regcomp(regex_t* compiled, const char* pattern,
                                                   int flags) {
  if (current != nullptr && current->regcompFails) {
    return REG_ESPACE;
  }
  const int result = real<int (*)(regex_t*, const char*, int)>("regcomp")(compiled, pattern, flags);
  if (current != nullptr && result == 0) {
    ++current->compiled;
  }
  return result;
}

__attribute__((visibility("default"))) int regexec(const regex_t* compiled, const char* text,
                                                   size_t count, regmatch_t* matches, int flags) {
  using Regexec = int (*)(const regex_t*, const char*, size_t, regmatch_t*, int);
  return current != nullptr && current->regexecFails
             ? REG_ESPACE
             : real<Regexec>("regexec")(compiled, text, count, matches, flags);
}

__attribute__((visibility("default"))) void regfree(regex_t* compiled) {
  if (current != nullptr) {
    ++current->freed;
  }
  real<void (*)(regex_t*)>("regfree")(compiled);
}

__attribute__((visibility("default"))) char* strdup(const char* text) noexcept {
  if (current != nullptr && current->strdupFails) {
    return nullptr;
  }
  return real<char* (*)(const char*)>("strdup")(text);
}

}  // extern "C"
