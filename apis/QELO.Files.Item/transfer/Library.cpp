#include "transfer/Library.h"

#include <dlfcn.h>

#include <string>

namespace files {

void* findInLibrary(const char* file, const char* function) {
  Dl_info self{};
  if (dladdr(reinterpret_cast<void*>(findInLibrary), &self) == 0 || self.dli_fname == nullptr) {
    return nullptr;
  }
  std::string path = self.dli_fname;
  path.replace(path.rfind('/') + 1, std::string::npos, file);
  void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  return library == nullptr ? nullptr : dlsym(library, function);
}

}  // namespace files
