#include "webapi/runner/execution/Credentials.h"

#include <errno.h>
#include <grp.h>
#include <syslog.h>
#include <unistd.h>

#include <cstring>

#include "webapi/platform/Core.h"
#include "webapi/platform/Credential.h"

namespace QELO {
namespace {

constexpr unsigned int kUnchanged = static_cast<unsigned int>(-1);

void logFailure(const char* call, unsigned real, unsigned effective, unsigned saved, int line) {
  const int error = errno;
  char text[1024] = {};
  const char* message = strerror_r(error, text, sizeof text);
  syslog(LOG_AUTH | LOG_ERR, "%s:%d ERROR: set%s(%d, %d, %d) [%s]", "APIRunner.cpp", line, call,
         static_cast<int>(real), static_cast<int>(effective), static_cast<int>(saved), message);
  errno = error;
}

void logChange(const char* call, unsigned real, unsigned effective, unsigned saved, int line) {
  syslog(LOG_AUTH | LOG_INFO, "%s:%d WARNING: set%s(%d, %d, %d)", "APIRunner.cpp", line, call,
         static_cast<int>(real), static_cast<int>(effective), static_cast<int>(saved));
}

bool becomeRootUser() {
  if (setresuid(kUnchanged, 0, kUnchanged) != 0) {
    logFailure("resuid", kUnchanged, 0, kUnchanged, __LINE__);
    return false;
  }
  logChange("resuid", kUnchanged, 0, kUnchanged, __LINE__);
  return true;
}

bool becomeRootGroup() {
  if (setresgid(kUnchanged, 0, kUnchanged) != 0) {
    logFailure("resgid", kUnchanged, 0, kUnchanged, __LINE__);
    return false;
  }
  logChange("resgid", kUnchanged, 0, kUnchanged, __LINE__);
  return true;
}

bool isCurrentUser(const std::string& name) {
  uid_t uid = 0;
  gid_t gid = 0;
  return QELOUserGetUGID(name.c_str(), &uid, &gid) == 0 && uid == geteuid() && gid == getegid();
}

}  // namespace

bool Credentials::Save() {
  if (getresgid(&group_.real, &group_.effective, &group_.saved) != 0 ||
      getresuid(&user_.real, &user_.effective, &user_.saved) != 0) {
    return false;
  }
  const int count = getgroups(0, nullptr);
  supplementary_.resize(count > 0 ? static_cast<size_t>(count) : 0);
  if (count > 0) {
    getgroups(count, supplementary_.data());
  }
  return true;
}

bool Credentials::HaveChanged() const {
  return geteuid() != user_.effective || getegid() != group_.effective;
}

void Credentials::GiveBack() const {
  // The user's supplementary groups must not stay with the next call, and root alone sets them.
  if (user_.effective != 0 && setresuid(kUnchanged, 0, kUnchanged) == 0) {
    setgroups(supplementary_.size(), supplementary_.data());
  }
  if (setresgid(group_.real, group_.effective, group_.saved) != 0) {
    logFailure("resgid", group_.real, group_.effective, group_.saved, __LINE__);
  } else if (group_.effective == 0) {
    logChange("resgid", group_.real, group_.effective, group_.saved, __LINE__);
  }
  if (setresuid(user_.real, user_.effective, user_.saved) != 0) {
    logFailure("resuid", user_.real, user_.effective, user_.saved, __LINE__);
  } else if (user_.effective == 0) {
    logChange("resuid", user_.real, user_.effective, user_.saved, __LINE__);
    setgroups(supplementary_.size(), supplementary_.data());
  }
}

bool Credentials::BecomeRoot() {
  return (getegid() == 0 || becomeRootGroup()) && (geteuid() == 0 || becomeRootUser());
}

bool Credentials::BecomeUser(const std::string& name, bool keepPrivilege) {
  if (!becomeRootUser() && isCurrentUser(name)) {
    return true;
  }
  return ResetCredentialsByName(name.c_str(), keepPrivilege);
}

}  // namespace QELO
