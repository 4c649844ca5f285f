// What changes names and is done at once: create_folder, rename.

#include "calls/Call.h"
#include "calls/ItemJson.h"
#include "calls/Methods.h"

namespace files {
namespace {

using QELO::APIRequest;

constexpr unsigned kFolderMode = 0777;  ///< before the process's mask

/// Makes the folders above `path` that are missing. @return false when one was refused
bool makeParents(Call& call, const VirtualPath& path) {
  const VirtualPath parent = path.Parent();
  if (parent.IsShare() || parent.IsRoot()) {
    return true;
  }
  Located located;
  if (!makeParents(call, parent) || !call.LocateForChange(parent, located)) {
    return false;
  }
  Item item;
  if (located.parent.Look(located.name, item) == Reason::kNone) {
    return true;  // what it is shows when it is entered
  }
  if (!isNewName(located.name)) {
    return call.Refuse(Reason::kBadName, parent);
  }
  const Reason reason = located.parent.MakeFolder(located.name, kFolderMode);
  return reason == Reason::kNone || reason == Reason::kExists || call.Refuse(reason, parent);
}

/// Answers with the item of this name.
void answerItem(Call& call, const Folder& parent, const VirtualPath& path) {
  Item item;
  if (const Reason reason = parent.Look(path.Name(), item); reason != Reason::kNone) {
    call.Refuse(reason, path);
    return;
  }
  call.Response().SetSuccess(jsonOf(path.Parent(), item));
}

}  // namespace

void createFolder(APIRequest* request, QELO::APIResponse* response) {
  Call call(request, response);
  const auto parents = request->GetAndCheckBool("parents", APIRequest::PARAM_OPTIONAL);
  VirtualPath path;
  Located located;
  if (parents.IsInvalid()) {
    call.RefuseParameters();
    return;
  }
  if (!call.ReadPath("path", path)) {
    return;
  }
  if (!isNewName(path.Name()) && !path.IsRoot()) {
    call.Refuse(Reason::kBadName, path);
    return;
  }
  if ((parents.Get(false) && !makeParents(call, path)) || !call.LocateForChange(path, located)) {
    return;
  }
  if (const Reason reason = located.parent.MakeFolder(located.name, kFolderMode);
      reason != Reason::kNone) {
    call.Refuse(reason, path);
    return;
  }
  answerItem(call, located.parent, path);
}

void rename(APIRequest* request, QELO::APIResponse* response) {
  Call call(request, response);
  const auto name = request->GetAndCheckString("name");
  VirtualPath path;
  Located located;
  if (name.IsInvalid() || name.IsReset()) {
    call.RefuseParameters();
    return;
  }
  if (!call.ReadPath("path", path) || !call.LocateForChange(path, located)) {
    return;
  }
  if (!isNewName(name.Get())) {
    call.Refuse(Reason::kBadName, name.Get());
    return;
  }
  const VirtualPath renamed = path.Parent().Child(name.Get());
  const Reason reason = located.parent.Move(located.name, located.parent, name.Get());
  if (reason != Reason::kNone) {
    call.Refuse(reason, reason == Reason::kExists ? renamed : path);
    return;
  }
  answerItem(call, located.parent, renamed);
}

}  // namespace files
