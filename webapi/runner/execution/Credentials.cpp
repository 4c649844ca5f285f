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

std::vector<gid_t> currentGroups() {
  const int count = getgroups(0, nullptr);
  std::vector<gid_t> groups(count > 0 ? static_cast<size_t>(count) : 0);
  const int read = getgroups(static_cast<int>(groups.size()), groups.data());
  groups.resize(read > 0 ? static_cast<size_t>(read) : 0);
  return groups;
}

bool setGroups(const std::vector<gid_t>& groups) {
  const bool done = setgroups(groups.size(), groups.data()) == 0;
  if (done) {
    syslog(LOG_AUTH | LOG_INFO, "%s:%d WARNING: setgroups(%zu)", "APIRunner.cpp", __LINE__,
           groups.size());
  } else {
    syslog(LOG_AUTH | LOG_ERR, "%s:%d ERROR: setgroups(%zu) [%m]", "APIRunner.cpp", __LINE__,
           groups.size());
  }
  return done;
}

bool isCurrentUser(const std::string& name) {
  uid_t uid = 0;
  gid_t gid = 0;
  return QELOUserGetUGID(name.c_str(), &uid, &gid) == 0 && uid == geteuid() && gid == getegid();
}

}  // namespace

bool Credentials::areLost_ = false;

bool Credentials::Save() {
  supplementary_ = currentGroups();
  return getresgid(&group_.real, &group_.effective, &group_.saved) == 0 &&
         getresuid(&user_.real, &user_.effective, &user_.saved) == 0;
}

bool Credentials::HaveChanged() const {
  Credentials now;
  const auto differ = [](const Ids& left, const Ids& right) {
    return left.real != right.real || left.effective != right.effective ||
           left.saved != right.saved;
  };
  return !now.Save() || differ(now.user_, user_) || differ(now.group_, group_) ||
         now.supplementary_ != supplementary_;
}

bool Credentials::GiveBack() const {
  const bool otherGroups = supplementary_ != currentGroups();
  const bool isRoot = user_.effective == 0;
  bool good = true;
  if (otherGroups && !isRoot) {  // root alone sets groups
    good = becomeRootUser() && setGroups(supplementary_);
  }
  good = SetIds("resgid", setresgid, group_) && good;
  const bool hasUser = SetIds("resuid", setresuid, user_);
  if (otherGroups && isRoot && hasUser) {
    good = setGroups(supplementary_) && good;
  }
  areLost_ = areLost_ || !good || !hasUser;
  return good && hasUser;
}

bool Credentials::SetIds(const char* call, int (*set)(unsigned, unsigned, unsigned),
                         const Ids& ids) {
  if (set(ids.real, ids.effective, ids.saved) != 0) {
    logFailure(call, ids.real, ids.effective, ids.saved, __LINE__);
    return false;
  }
  if (ids.effective == 0) {
    logChange(call, ids.real, ids.effective, ids.saved, __LINE__);
  }
  return true;
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
