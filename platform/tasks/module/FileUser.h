#pragma once

#include <sys/fsuid.h>
#include <unistd.h>

namespace QELO::Platform {

/// Lets root reach files with the rights of a user alone while it lives: what that user may have
/// put in their way, a link or a file of another's, is then no more than the user could reach.
/// Other users have their own rights already and keep them.
class FileUser {
 public:
  FileUser(uid_t user, gid_t group) : switched_(geteuid() == 0 && user != 0) {
    if (switched_) {
      setfsgid(group);
      setfsuid(user);
      good_ = static_cast<uid_t>(setfsuid(static_cast<uid_t>(-1))) == user;
    }
  }
  ~FileUser() {
    if (switched_) {
      setfsuid(geteuid());
      setfsgid(getegid());
    }
  }
  FileUser(const FileUser&) = delete;
  FileUser& operator=(const FileUser&) = delete;

  /// False when the kernel refused.
  bool Good() const { return good_; }

 private:
  bool switched_;
  bool good_ = true;
};

}  // namespace QELO::Platform
