#include "platform/sharing/module/SharingModule.h"

#include "platform/sharing/module/SqliteLinkStore.h"
#include "webapi/Export.h"

using QELO::Platform::LinkStore;
using QELO::Platform::SqliteLinkStore;

extern "C" WEBAPI_API LinkStore* webapiSharingOpen(const char* path, bool create,
                                                   std::string& error) {
  auto store = std::make_unique<SqliteLinkStore>();
  if (!store->Open(path, create)) {
    error = store->Error();
    return nullptr;
  }
  return store.release();
}
