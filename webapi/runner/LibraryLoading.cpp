// The runner's API libraries: each is opened once and asked for its tables.

#include <dlfcn.h>

#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/model/Log.h"
#include "webapi/runner/Fence.h"

namespace QELO {

bool APIRunner::OpenLib(APIRequest* request, _tag_API_TABLE** table,
                        _tag_API_CHECK_TABLE** checkTable) {
  if (request == nullptr || table == nullptr) {
    WEBAPI_LOG("APIRunner.cpp", "Bad parameters");
    return false;
  }
  void* handle = nullptr;
  if (!CacheLib(request, &handle)) {
    return false;
  }
  if (checkTable != nullptr) {
    GetCheckTableFunc(handle, checkTable);  // a library without checks is normal
  }
  if (!GetTableFunc(handle, table)) {
    WEBAPI_LOG("APIRunner.cpp", "Get API Table Fail");
    return false;
  }
  return true;
}

bool APIRunner::CacheLib(APIRequest* request, void** handle) {
  const std::string path = JsonHelper::asString(request->GetAPIInfo("lib", ""));
  if (path.empty()) {
    WEBAPI_LOG("APIRunner.cpp", "library path empty");
    return false;
  }
  const auto cached = libraries_.find(path);
  if (cached != libraries_.end()) {
    *handle = cached->second;
    return true;
  }
  void* opened = dlopen(path.c_str(), RTLD_LAZY);
  if (opened == nullptr) {
    WEBAPI_LOG("APIRunner.cpp", "cannot open library: %s. error = %s", path.c_str(), dlerror());
    return false;
  }
  libraries_[path] = opened;
  *handle = opened;
  return true;
}

bool APIRunner::GetTableFunc(void* handle, _tag_API_TABLE** table) {
  if (handle == nullptr || table == nullptr) {
    return false;
  }
  dlerror();
  void* symbol = dlsym(handle, "GetAPITable");
  const char* error = dlerror();
  if (error != nullptr) {
    syslog(LOG_DEBUG, "%s:%d cannot load table: %s", "APIRunner.cpp", __LINE__, error);
    return false;
  }
  *table = nullptr;
  if (symbol != nullptr) {
    Fence("GetAPITable", [&] { *table = reinterpret_cast<_tag_API_TABLE* (*)()>(symbol)(); });
  }
  if (*table == nullptr) {
    WEBAPI_LOG("APIRunner.cpp", "cannot get api table");
    return false;
  }
  return true;
}

bool APIRunner::GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable) {
  if (handle == nullptr || checkTable == nullptr) {
    return false;
  }
  dlerror();
  void* symbol = dlsym(handle, "GetAPICheckTable");
  if (dlerror() != nullptr || symbol == nullptr) {
    return true;
  }
  *checkTable = nullptr;
  Fence("GetAPICheckTable",
        [&] { *checkTable = reinterpret_cast<_tag_API_CHECK_TABLE* (*)()>(symbol)(); });
  if (*checkTable == nullptr) {
    WEBAPI_LOG("APIRunner.cpp", "cannot get api check table");
    return false;
  }
  return true;
}

void APIRunner::CloseLib() {
  for (const auto& [path, handle] : libraries_) {
    dlclose(handle);
  }
  libraries_.clear();
}

}  // namespace QELO
