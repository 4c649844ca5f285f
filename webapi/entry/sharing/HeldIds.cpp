#include "webapi/entry/sharing/HeldIds.h"

#include <grp.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "webapi/runner/execution/Credentials.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WebEntry";

bool readGroups(std::vector<gid_t>& groups) {
  const int count = getgroups(0, nullptr);
  groups.resize(count > 0 ? static_cast<size_t>(count) : 0);
  return count >= 0 && getgroups(count, groups.data()) == count;
}

}  // namespace

bool HeldIds::Save() {
  return readGroups(supplementary_) &&
         getresgid(&group_.real, &group_.effective, &group_.saved) == 0 &&
         getresuid(&user_.real, &user_.effective, &user_.saved) == 0;
}

bool HeldIds::GiveBack() const {
  bool good = Set("resgid", setresgid, group_);
  good = Set("resuid", setresuid, user_) && good;
  good = SetGroups() && good;
  if (!good) {
    Credentials::Lose();
  }
  return good;
}

bool HeldIds::SetGroups() const {
  std::vector<gid_t> now;
  if (readGroups(now) && now == supplementary_) {
    return true;
  }
  if (setgroups(supplementary_.size(), supplementary_.data()) != 0) {
    syslog(LOG_ERR, "%s:%d ERROR: setgroups(%zu) [%m]", kSource, __LINE__, supplementary_.size());
    return false;
  }
  syslog(LOG_AUTH | LOG_INFO, "%s:%d WARNING: setgroups(%zu)", kSource, __LINE__,
         supplementary_.size());
  return true;
}

bool HeldIds::Set(const char* call, int (*set)(unsigned, unsigned, unsigned), const Ids& ids) {
  const auto number = [](unsigned id) { return static_cast<int>(id); };
  if (set(ids.real, ids.effective, ids.saved) != 0) {
    syslog(LOG_ERR, "%s:%d ERROR: set%s(%d, %d, %d) [%s]", kSource, __LINE__, call,
           number(ids.real), number(ids.effective), number(ids.saved), strerror(errno));
    return false;
  }
  if (ids.effective == 0) {
    syslog(LOG_AUTH | LOG_INFO, "%s:%d WARNING: set%s(%d, %d, %d)", kSource, __LINE__, call,
           number(ids.real), number(ids.effective), number(ids.saved));
  }
  return true;
}

}  // namespace QELO
