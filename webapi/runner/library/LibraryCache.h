#pragma once

#include <map>
#include <string>
#include <utility>

#include "webapi/APITable.h"

namespace QELO {

/// The API libraries that are open: each is opened once and asked for its tables. The operations
/// are APIRunner's of the same name.
class LibraryCache {
 public:
  /// @param libraries  handles by path; closed by CloseLib() and by nothing else
  explicit LibraryCache(std::map<std::string, void*>& libraries) : libraries_(libraries) {}
  LibraryCache(const LibraryCache&) = delete;
  LibraryCache& operator=(const LibraryCache&) = delete;

  bool OpenLib(APIRequest* request, _tag_API_TABLE** table, _tag_API_CHECK_TABLE** checkTable);
  bool CacheLib(APIRequest* request, void** handle);
  bool GetTableFunc(void* handle, _tag_API_TABLE** table);
  bool GetCheckTableFunc(void* handle, _tag_API_CHECK_TABLE** checkTable);
  void CloseLib();

 private:
  void* FindFunction(void* handle, const char* name);

  std::map<std::string, void*>& libraries_;
  std::map<std::pair<void*, std::string>, void*> functions_;  ///< null: the library has none
};

}  // namespace QELO
