#include "tests/harness/Ids.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

namespace QELO {
namespace {

Ids realOnes() {
  Ids ids{};
  syscall(SYS_getresuid, &ids.user.real, &ids.user.effective, &ids.user.saved);
  syscall(SYS_getresgid, &ids.group.real, &ids.group.effective, &ids.group.saved);
  const long count = syscall(SYS_getgroups, 0, nullptr);
  ids.groups.resize(count > 0 ? static_cast<size_t>(count) : 0);
  syscall(SYS_getgroups, ids.groups.size(), ids.groups.data());
  return ids;
}

}  // namespace

Ids& Ids::Get() {
  static Ids ids = realOnes();
  return ids;
}

void Ids::Reset() {
  Get() = realOnes();
}

void Ids::Become(uid_t uid, gid_t gid, bool keepPrivilege) {
  Ids& ids = Get();
  ids.groups = {gid};
  ids.user = keepPrivilege ? Set{ids.user.real, uid, ids.user.saved} : Set{uid, uid, uid};
  ids.group = keepPrivilege ? Set{ids.group.real, gid, ids.group.saved} : Set{gid, gid, gid};
}

}  // namespace QELO

using QELO::Ids;

namespace {

int give(const Ids::Set& from, uid_t* real, uid_t* effective, uid_t* saved) {
  *real = from.real;
  *effective = from.effective;
  *saved = from.saved;
  return 0;
}

void take(uid_t& id, uid_t wanted) {
  id = wanted == static_cast<uid_t>(-1) ? id : wanted;
}

/// The made-up process was started by root, so it may have any.
int set(Ids::Set& to, uid_t real, uid_t effective, uid_t saved) {
  take(to.real, real);
  take(to.effective, effective);
  take(to.saved, saved);
  return 0;
}

}  // namespace

// These take the place of the C library's for the whole test program.
#pragma GCC visibility push(default)
extern "C" {

uid_t getuid() {
  return Ids::Get().user.real;
}
uid_t geteuid() {
  return Ids::Get().user.effective;
}
gid_t getgid() {
  return Ids::Get().group.real;
}
gid_t getegid() {
  return Ids::Get().group.effective;
}
int getresuid(uid_t* real, uid_t* effective, uid_t* saved) {
  return give(Ids::Get().user, real, effective, saved);
}
int getresgid(gid_t* real, gid_t* effective, gid_t* saved) {
  return give(Ids::Get().group, real, effective, saved);
}
int setresuid(uid_t real, uid_t effective, uid_t saved) {
  return set(Ids::Get().user, real, effective, saved);
}
int setresgid(gid_t real, gid_t effective, gid_t saved) {
  return set(Ids::Get().group, real, effective, saved);
}
int getgroups(int size, gid_t* list) {
  const std::vector<gid_t>& groups = Ids::Get().groups;
  if (size != 0 && static_cast<size_t>(size) < groups.size()) {
    errno = EINVAL;
    return -1;
  }
  for (size_t i = 0; size != 0 && i < groups.size(); ++i) {
    list[i] = groups[i];
  }
  return static_cast<int>(groups.size());
}
int setgroups(size_t count, const gid_t* list) {
  Ids::Get().groups.assign(list, list + count);
  return 0;
}

}  // extern "C"
#pragma GCC visibility pop
