// The web entry's check of sharing links: the work is LinkCheck's and CheckLibraries'.

#include "webapi/WebEntry.h"
#include "webapi/entry/sharing/CheckLibraries.h"
#include "webapi/entry/sharing/LinkCheck.h"

namespace QELO {

LinkCheck& WebEntry::Links() {
  if (links_ == nullptr) {
    links_ = std::make_unique<LinkCheck>(*this, Context());
  }
  return *links_;
}

bool WebEntry::CheckSharingPermission(APIRequest* request, APIResponse* response) {
  return Links().CheckSharingPermission(request, response);
}

void WebEntry::InitSharingSession(APIRequest* request) {
  Links().InitSharingSession(request);
}

bool WebEntry::CheckSharingAppPermission(APIRequest* request, APIResponse* response) {
  return Links().CheckSharingAppPermission(request, response);
}

std::string WebEntry::GetSharingCheckLibPath(APIRequest* request) {
  return CheckLibraries::GetSharingCheckLibPath(request);
}

bool WebEntry::OpenSharingCheckLib(APIRequest* request, _tag_API_SHARING_CHECK_TABLE** table) {
  return Links().Libraries().OpenSharingCheckLib(request, table);
}

bool WebEntry::GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table) {
  return CheckLibraries::GetSharingCheckTableFunc(handle, table);
}

bool WebEntry::GetSharingCheckFunc(APIRequest* request, _tag_API_SHARING_CHECK_TABLE* table,
                                   bool (**check)(APIRequest*, APIResponse*)) {
  return CheckLibraries::GetSharingCheckFunc(request, table, check);
}

int WebEntry::RegexMatch(const char* pattern, const char* subject) {
  return CheckLibraries::RegexMatch(pattern, subject);
}

}  // namespace QELO
