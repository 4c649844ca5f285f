#include "webapi/runner/library/LibraryCache.h"

#include <dlfcn.h>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/runner/execution/Fence.h"
#include "webapi/runner/library/LoadLibrary.h"
#include "webapi/runner/library/PreloadedLibraries.h"

namespace QELO {
namespace {

constexpr char kTableFunction[] = "GetAPITable";
constexpr char kCheckTableFunction[] = "GetAPICheckTable";

}  // namespace

bool LibraryCache::OpenLib(APIRequest* request, _tag_API_TABLE** table,
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

bool LibraryCache::CacheLib(APIRequest* request, void** handle) {
  const std::string path =
      JsonHelper::asString(request->GetAPIInfoRef("lib", Json::Value::nullSingleton()));
  if (path.empty()) {
    WEBAPI_LOG("APIRunner.cpp", "library path empty");
    return false;
  }
  const auto cached = libraries_.find(path);
  if (cached != libraries_.end()) {
    *handle = cached->second;
    return true;
  }
  std::string error;
  void* opened = LoadLibrary(path, error);
  if (opened == nullptr) {
    WEBAPI_LOG("APIRunner.cpp", "cannot open library: %s. error = %s", LogText(path).c_str(),
               LogText(error).c_str());
    return false;
  }
  libraries_[path] = opened;
  // Now, and not in each child that is forked from here on.
  FindFunction(opened, kTableFunction);
  FindFunction(opened, kCheckTableFunction);
  *handle = opened;
  return true;
}

/// Kept, since looking for what is not there walks all that the library depends on.
void* LibraryCache::FindFunction(void* handle, std::string_view name) {
  for (const Function& known : functions_) {
    if (known.library == handle && known.name == name) {
      return known.address;
    }
  }
  functions_.push_back({handle, name, dlsym(handle, name.data())});
  dlerror();  // its text is made when it is asked for, or at the next failure
  return functions_.back().address;
}

bool LibraryCache::GetTableFunc(void* handle, _tag_API_TABLE** table) {
  if (handle == nullptr || table == nullptr) {
    return false;
  }
  void* symbol = FindFunction(handle, kTableFunction);
  const char* error =
      symbol == nullptr && dlsym(handle, kTableFunction) == nullptr ? dlerror() : nullptr;
  if (error != nullptr) {
    syslog(LOG_DEBUG, "%s:%d cannot load table: %s", "APIRunner.cpp", __LINE__,
           LogText(error).c_str());
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

bool LibraryCache::GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable) {
  if (handle == nullptr || checkTable == nullptr) {
    return false;
  }
  void* symbol = FindFunction(handle, kCheckTableFunction);
  if (symbol == nullptr) {
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

void LibraryCache::CloseLib() {
  for (const auto& [path, handle] : libraries_) {
    if (!PreloadedLibraries::Close(handle)) {
      dlclose(handle);
    }
  }
  libraries_.clear();
  functions_.clear();
}

}  // namespace QELO
