#pragma once

#include <map>
#include <string>

#include "webapi/APITable.h"

namespace QELO {

/// The sharing check libraries that are open. The operations are WebEntry's of the same name.
class CheckLibraries {
 public:
  CheckLibraries() = default;
  CheckLibraries(const CheckLibraries&) = delete;
  CheckLibraries& operator=(const CheckLibraries&) = delete;

  static std::string GetSharingCheckLibPath(APIRequest* request);
  bool OpenSharingCheckLib(APIRequest* request, _tag_API_SHARING_CHECK_TABLE** table);
  static bool GetSharingCheckTableFunc(void* handle, _tag_API_SHARING_CHECK_TABLE** table);
  static bool GetSharingCheckFunc(APIRequest* request, _tag_API_SHARING_CHECK_TABLE* table,
                                  bool (**check)(APIRequest*, APIResponse*));
  static int RegexMatch(const char* pattern, const char* subject);

 private:
  std::map<std::string, void*> handles_;  ///< by path; never closed
};

}  // namespace QELO
