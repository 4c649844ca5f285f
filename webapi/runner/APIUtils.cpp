#include "webapi/APIUtils.h"

#include <syslog.h>
#include <unistd.h>

#include "webapi/platform/Core.h"

namespace QELO {
namespace {

constexpr char kSource[] = "APIUtils.cpp";
constexpr char kMarker[] = "IF_RUN_AS";
constexpr uid_t kSameUser = static_cast<uid_t>(-1);
constexpr gid_t kSameGroup = static_cast<gid_t>(-1);

bool becomeUser(uid_t user) {
  return setresuid(kSameUser, user, kSameUser) == 0;
}

bool becomeGroup(gid_t group) {
  return setresgid(kSameGroup, group, kSameGroup) == 0;
}

/// Root as the effective user and group while it lives.
class RunAsRoot {
 public:
  RunAsRoot() : user_(geteuid()), group_(getegid()) {
    good_ =
        (geteuid() == 0 || becomeUser(0)) && (getegid() == 0 || becomeGroup(0)) && becomeUser(0);
    if (!good_) {
      syslog(LOG_AUTH | LOG_ERR, "%s:%d ERROR: %s(%d, %d)", kSource, __LINE__, kMarker, 0, 0);
    }
  }
  RunAsRoot(const RunAsRoot&) = delete;
  RunAsRoot& operator=(const RunAsRoot&) = delete;
  ~RunAsRoot() {
    if (!GiveBack()) {
      syslog(LOG_AUTH | LOG_CRIT, "%s:%d ERROR: ~%s(%d, %d)", kSource, __LINE__, kMarker,
             static_cast<int>(user_), static_cast<int>(group_));
    }
  }

  bool IsGood() const { return good_; }

 private:
  bool GiveBack() const {
    const bool group =
        getegid() == group_ || ((geteuid() == 0 || becomeUser(0)) && becomeGroup(group_));
    // Also without the group: else the caller would go on as root.
    const bool user =
        geteuid() == user_ || ((geteuid() == 0 || becomeUser(0)) && becomeUser(user_));
    return group && user;
  }

  uid_t user_;
  gid_t group_;
  bool good_;
};

}  // namespace

bool APIUtils::SetQeloInfo(const std::string& key, const std::string& value) {
  const RunAsRoot root;
  return root.IsGood() && QLIBCINFOSetKeyValue(key.c_str(), value.c_str()) >= 0;
}

}  // namespace QELO
