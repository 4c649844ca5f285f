#include <grp.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "platform/accounts/AccountDatabase.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Credential.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "Credentials.cpp";
constexpr uid_t kSameUid = static_cast<uid_t>(-1);
constexpr gid_t kSameGid = static_cast<gid_t>(-1);

struct GroupIds {
  gid_t real, effective, saved;
  std::vector<gid_t> supplementary;
};

bool readGroupIds(GroupIds& ids) {
  const int count = getgroups(0, nullptr);
  if (count < 0 || getresgid(&ids.real, &ids.effective, &ids.saved) != 0) {
    return false;
  }
  ids.supplementary.resize(static_cast<size_t>(count));
  return getgroups(count, ids.supplementary.data()) == count;
}

void restoreGroupIds(const GroupIds& ids) {
  if (setresgid(ids.real, ids.effective, ids.saved) != 0 ||
      setgroups(ids.supplementary.size(), ids.supplementary.data()) != 0) {
    WEBAPI_LOG(kSource, "cannot restore the group ids [%s]", strerror(errno));
  }
}

bool setIds(const Account& account, bool keepPrivilege) {
  const gid_t otherGid = keepPrivilege ? kSameGid : account.gid;
  const uid_t otherUid = keepPrivilege ? kSameUid : account.uid;
  return setresgid(otherGid, account.gid, otherGid) == 0 &&
         setresuid(otherUid, account.uid, otherUid) == 0;
}

bool switchAsRoot(const Account& account, bool keepPrivilege) {
  std::vector<gid_t> groups;
  GroupIds before;
  if (findGroupsOf(account, groups) != Lookup::kFound || !readGroupIds(before)) {
    return false;
  }
  if (setgroups(groups.size(), groups.data()) == 0 && setIds(account, keepPrivilege)) {
    return true;
  }
  WEBAPI_LOG(kSource, "cannot become %s [%s]", LogText(account.name).c_str(), strerror(errno));
  restoreGroupIds(before);
  return false;
}

/// What others than the owner may write, or put there, would run as the owner and do their will.
bool mayOthersChange(const std::string& path, const struct stat& info) {
  const size_t slash = path.rfind('/');
  const std::string directory = slash == std::string::npos ? "." : path.substr(0, slash + 1);
  struct stat place {};
  return stat(directory.c_str(), &place) != 0 ||
         (place.st_uid != 0 && place.st_uid != info.st_uid) ||
         ((info.st_mode | place.st_mode) & (S_IWGRP | S_IWOTH)) != 0;
}

}  // namespace
}  // namespace QELO::Platform

bool ResetCredentialsByName(const char* name, bool keepPrivilege) {
  using namespace QELO::Platform;
  Account account;
  switch (findAccount(name, account)) {
    case Lookup::kFound:
      break;
    case Lookup::kAbsent:
      WEBAPI_LOG(kSource, "there is no account %s", QELO::LogText(name).c_str());
      errno = ENOENT;
      return false;
    default:
      WEBAPI_LOG(kSource, "cannot look up the account %s", QELO::LogText(name).c_str());
      errno = EIO;
      return false;
  }
  // To the kernel -1 means "leave as it is", so such an account would keep root's rights.
  if (account.uid == kSameUid || account.gid == kSameGid) {
    errno = EINVAL;
    return false;
  }
  if (geteuid() == 0) {
    return switchAsRoot(account, keepPrivilege);
  }
  if (account.uid != geteuid() || account.gid != getegid()) {
    WEBAPI_LOG(kSource, "cannot become %s without root's rights", QELO::LogText(name).c_str());
    errno = EPERM;
    return false;
  }
  return keepPrivilege || setIds(account, false);
}

bool InitCredentialsByExecutable(const char* path, bool keepPrivilege) {
  using namespace QELO::Platform;
  struct stat info {};
  if (stat(path, &info) != 0 || !S_ISREG(info.st_mode)) {
    WEBAPI_LOG(kSource, "there is no file %s", QELO::LogText(path).c_str());
    errno = ENOENT;
    return false;
  }
  if (mayOthersChange(path, info)) {
    WEBAPI_LOG(kSource, "others may write %s", QELO::LogText(path).c_str());
    errno = EPERM;
    return false;
  }
  // Root's groups decide nothing.
  if (keepPrivilege && info.st_uid == 0 && geteuid() == 0) {
    return getegid() == 0 || setresgid(kSameGid, 0, kSameGid) == 0;
  }
  Account account;
  if (findAccountById(info.st_uid, account) != Lookup::kFound) {
    WEBAPI_LOG(kSource, "the owner of %s is no account: user id %u", QELO::LogText(path).c_str(),
               info.st_uid);
    errno = EPERM;
    return false;
  }
  return ResetCredentialsByName(account.name.c_str(), keepPrivilege);
}
