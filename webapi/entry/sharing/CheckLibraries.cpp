#include "webapi/entry/sharing/CheckLibraries.h"

#include <dlfcn.h>
#include <regex.h>

#include <string_view>

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

/// A whole name: "^", letters, digits, "_", "-" and dots as "[.]", "$". Most are of this kind, and
/// to compile one costs more than all the rest of a table.
/// @return false when the pattern is of another kind
bool readWholeName(const char* pattern, std::string& name) {
  constexpr std::string_view kDot = "[.]";
  std::string_view rest(pattern);
  if (rest.size() < 2 || rest.front() != '^' || rest.back() != '$') {
    return false;
  }
  rest = rest.substr(1, rest.size() - 2);
  while (!rest.empty()) {
    const bool isDot = rest.starts_with(kDot);
    const char c = isDot ? '.' : rest.front();
    if (!isDot && !IsAlphanumeric(c) && c != '_' && c != '-') {
      return false;
    }
    name += c;
    rest.remove_prefix(isDot ? kDot.size() : 1);
  }
  return true;
}

}  // namespace

std::string CheckLibraries::GetSharingCheckLibPath(APIRequest* request) {
  if (request == nullptr) {
    return "";
  }
  const std::string project = request->GetSharingEntry().get_project_name();
  const bool leadsElsewhere =
      project.find("../") != std::string::npos || project.find('\0') != std::string::npos;
  return leadsElsewhere ? "" : Paths::kSharingCheckDir + project + ".so";
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
  std::string name;
  if (readWholeName(pattern, name)) {
    return name == subject ? 0 : REG_NOMATCH;
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
