#include "platform/sharing/LinkStore.h"

#include <sys/stat.h>

#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/sharing/module/SharingModule.h"
#include "webapi/base/Log.h"

namespace QELO::Platform {

LinkStoreFile findLinkStore() {
  struct stat info {};
  return stat(Paths::kSharingDatabase, &info) == 0 ? LinkStoreFile{info.st_dev, info.st_ino}
                                                   : LinkStoreFile();
}

bool hasLinkStore() {
  return !(findLinkStore() == LinkStoreFile());
}

std::unique_ptr<LinkStore> openLinkStore(bool create) {
  constexpr char kSource[] = "LinkStore.cpp";
  const auto open = reinterpret_cast<SharingOpen>(findInModule(kSharingModule, kSharingOpen));
  if (open == nullptr) {
    return nullptr;
  }
  std::string error;
  std::unique_ptr<LinkStore> store(open(Paths::kSharingDatabase, create, error));
  if (store == nullptr) {
    WEBAPI_LOG(kSource, "cannot open the sharing links [%s]", LogText(error).c_str());
  }
  return store;
}

}  // namespace QELO::Platform
