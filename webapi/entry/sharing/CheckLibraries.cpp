#include "webapi/entry/sharing/CheckLibraries.h"

#include <dlfcn.h>
#include <regex.h>

#include "webapi/APIRequest.h"
#include "webapi/base/Log.h"
#include "webapi/base/Text.h"
#include "webapi/platform/Paths.h"
#include "webapi/platform/Sharing.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/execution/Fence.h"
#include "webapi/runner/library/LoadLibrary.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WebEntry";
constexpr char kTableFunction[] = "GetAPISharingCheckTable";

bool isEmpty(const char* pattern) {
  return pattern == nullptr || *pattern == '\0';
}

}  // namespace

std::string CheckLibraries::GetSharingCheckLibPath(APIRequest* request) {
  const std::string project =
      request != nullptr ? request->GetSharingEntry().get_project_name() : "";
  // No other name leads to this directory alone.
  return IsProjectName(project) ? Paths::kSharingCheckDir + project + ".so" : "";
}

bool CheckLibraries::OpenSharingCheckLib(APIRequest* request,
                                         _tag_API_SHARING_CHECK_TABLE** table) {
  const std::string path = GetSharingCheckLibPath(request);
  if (path.empty()) {
    WEBAPI_LOG(kSource, "Bad parameters");
    return false;
  }
  void*& handle = handles_[path];
  std::string error;
  if (handle == nullptr && (handle = LoadLibrary(path, error)) == nullptr) {
    WEBAPI_LOG(kSource, "cannot open library: %s. error = %s", LogText(path).c_str(),
               LogText(error).c_str());
    return false;
  }
  if (!GetSharingCheckTableFunc(handle, table)) {
    WEBAPI_LOG(kSource, "Get Sharing Check Table Fail");
    return false;
  }
  return true;
}

bool CheckLibraries::GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table) {
  if (handle == nullptr || table == nullptr) {
    return false;
  }
  dlerror();
  void* symbol = dlsym(handle, kTableFunction);
  const char* error = dlerror();
  if (error != nullptr) {
    WEBAPI_LOG(kSource, "cannot load sharing check table: %s", LogText(error).c_str());
    return false;
  }
  *table = nullptr;
  if (symbol != nullptr) {
    Fence(
        kTableFunction,
        [&] { *table = reinterpret_cast<_tag_API_SHARING_CHECK_TABLE* (*)()>(symbol)(); }, kSource);
  }
  if (*table == nullptr) {
    WEBAPI_LOG(kSource, "cannot get sharing check table");
    return false;
  }
  return true;
}

bool CheckLibraries::GetSharingCheckFunc(APIRequest* request, _tag_API_SHARING_CHECK_TABLE* table,
                                         bool (**check)(APIRequest*, APIResponse*)) {
  if (request == nullptr || table == nullptr || check == nullptr) {
    WEBAPI_LOG(kSource, "bad parameters");
    return false;
  }
  const CallName call(*request);
  const std::string project = request->GetSharingEntry().get_project_name();
  for (; table->api != nullptr; ++table) {
    if (table->version != 0 && table->version != call.version) {
      continue;
    }
    if (isEmpty(table->api)) {
      WEBAPI_LOG(kSource, "warning: empty api regex in %s", LogText(project).c_str());
      continue;
    }
    if (RegexMatch(table->api, call.api.c_str()) != 0) {
      continue;
    }
    if (isEmpty(table->method)) {
      WEBAPI_LOG(kSource, "warning: empty method regex in %s", LogText(project).c_str());
      continue;
    }
    if (RegexMatch(table->method, call.method.c_str()) == 0) {
      *check = table->check;
      return true;
    }
  }
  return false;
}

int CheckLibraries::RegexMatch(const char* pattern, const char* subject) {
  if (pattern[0] == '*' && pattern[1] == '\0') {
    return 0;
  }
  regex_t expression;
  const int fault = regcomp(&expression, pattern, REG_EXTENDED);
  if (fault != 0) {
    return fault;
  }
  const int result = regexec(&expression, subject, 0, nullptr, 0);
  regfree(&expression);
  return result;
}

}  // namespace QELO
