#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>
#include <vector>

#include "paths/Located.h"

namespace files {

/// One call of a method: whose shared folders it may reach, and its answer.
class Call {
 public:
  static constexpr unsigned kMostPaths = 1000;  ///< items that one call names

  Call(QELO::APIRequest* request, QELO::APIResponse* response);

  QELO::APIRequest& Request() const { return *request_; }
  QELO::APIResponse& Response() const { return *response_; }
  const Shares& SharedFolders() const { return shares_; }
  /// Where the libraries beside this one are.
  std::string LibraryDirectory() const;

  /// The parameter `name`, a path. @return false when it was refused, which is the answer
  bool ReadPath(const char* name, VirtualPath& path);
  /// The parameter `name`, a path or a list of 1 to kMostPaths of them.
  bool ReadPaths(const char* name, std::vector<VirtualPath>& paths);

  /// What each answers with is told as the error when it is false.
  bool Locate(const VirtualPath& path, Located& located);
  bool OpenFolder(const VirtualPath& path, Folder& folder);
  /// As Locate(), for something that is to be changed: not the shared folder itself, and none that
  /// is read only.
  bool LocateForChange(const VirtualPath& path, Located& located);
  bool OpenFolderForChange(const VirtualPath& path, Folder& folder);
  /// Whether things in its shared folder may be changed.
  bool IsChangeable(const VirtualPath& path);

  /// The answer is an error, which names the item. @return false
  bool Refuse(Reason reason, const std::string& path);
  bool Refuse(Reason reason, const VirtualPath& path) { return Refuse(reason, path.Text()); }
  /// A parameter is malformed. @return false
  bool RefuseParameters();

 private:
  bool Parse(const std::string& text, VirtualPath& path);

  QELO::APIRequest* request_;
  QELO::APIResponse* response_;
  Shares shares_;
};

/// What an error tells beside its code: {"path", "reason"}.
Json::Value errorsOf(Reason reason, const std::string& path);

}  // namespace files
