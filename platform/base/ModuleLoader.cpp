#include "platform/base/ModuleLoader.h"

#include <dlfcn.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "ModuleLoader.cpp";
constexpr char kModuleDir[] = WEBAPI_MODULE_DIR;

bool isSafe(const std::string& path, mode_t type) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0 && (info.st_mode & S_IFMT) == type && IsOwnFile(info);
}

}  // namespace

void* findInModule(const char* module, const char* function) {
  const std::string path = std::string(kModuleDir) + "/" + module;
  if (!isSafe(kModuleDir, S_IFDIR) || !isSafe(path, S_IFREG)) {
    WEBAPI_LOG(kSource, "refused to load %s: it is missing, or others may write it", path.c_str());
    return nullptr;
  }
  // A call uses a few of a module's functions; that all of them are there was seen when it was
  // linked.
  void* handle = dlopen(path.c_str(), RTLD_LAZY | RTLD_LOCAL);
  void* found = handle != nullptr ? dlsym(handle, function) : nullptr;
  if (found == nullptr) {
    const char* error = dlerror();
    WEBAPI_LOG(kSource, "cannot load %s [%s]", path.c_str(), error != nullptr ? error : "");
  }
  return found;
}

}  // namespace QELO::Platform
