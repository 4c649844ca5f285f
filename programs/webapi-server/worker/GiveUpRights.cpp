#include "programs/webapi-server/worker/GiveUpRights.h"

#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "webapi/platform/Credential.h"

namespace QELO {
namespace {

constexpr uid_t kRootUser = 0;
constexpr gid_t kRootGroup = 0;

bool hasNoCapability() {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct data[_LINUX_CAPABILITY_U32S_3]{};
  return syscall(SYS_capget, &header, data) == 0 &&
         std::all_of(std::begin(data), std::end(data), [](const auto& word) {
           return word.effective == 0 && word.permitted == 0 && word.inheritable == 0;
         });
}

bool hasOneUser() {
  uid_t real = 0;
  uid_t effective = 0;
  uid_t saved = 0;
  return getresuid(&real, &effective, &saved) == 0 && real == effective && saved == effective &&
         effective != kRootUser;
}

bool hasOneGroup() {
  gid_t real = 0;
  gid_t effective = 0;
  gid_t saved = 0;
  return getresgid(&real, &effective, &saved) == 0 && real == effective && saved == effective;
}

/// Whether root could be taken again by any of the three.
bool hasWayBack() {
  constexpr uid_t kSame = static_cast<uid_t>(-1);
  return setresuid(kRootUser, kSame, kSame) == 0 || setresuid(kSame, kRootUser, kSame) == 0 ||
         setresuid(kSame, kSame, kRootUser) == 0 ||
         (getegid() != kRootGroup && setresgid(kSame, kRootGroup, kSame) == 0);
}

}  // namespace

bool GiveUpRights(const std::string& account) {
  prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_CLEAR_ALL, 0, 0, 0);
  if (!ResetCredentialsByName(account.c_str(), false)) {
    return false;
  }
  // Whatever they were, they are the account's now, and what it inherits would be an executed
  // program's.
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct none[_LINUX_CAPABILITY_U32S_3]{};
  syscall(SYS_capset, &header, none);
  errno = EPERM;
  return hasOneUser() && hasOneGroup() && hasNoCapability() && !hasWayBack();
}

}  // namespace QELO
