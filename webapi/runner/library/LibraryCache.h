#pragma once

#include <map>
#include <string>
#include <string_view>
#include <vector>

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
  struct Function {
    void* library;
    std::string_view name;
    void* address;  ///< null: the library has none
  };

  /// @param name  lives as long as the process, with a NUL behind it
  void* FindFunction(void* handle, std::string_view name);

  std::map<std::string, void*>& libraries_;
  std::vector<Function> functions_;
};

}  // namespace QELO
