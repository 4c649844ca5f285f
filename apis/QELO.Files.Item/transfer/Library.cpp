#include "transfer/Library.h"

#include <dlfcn.h>

namespace files {

void* findInLibrary(const std::string& directory, const char* file, const char* function) {
  if (!directory.starts_with('/')) {
    return nullptr;
  }
  void* library = dlopen((directory + "/" + file).c_str(), RTLD_NOW | RTLD_LOCAL);
  return library == nullptr ? nullptr : dlsym(library, function);
}

}  // namespace files
