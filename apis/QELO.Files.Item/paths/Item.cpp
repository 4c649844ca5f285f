#include "paths/Item.h"

#include <fcntl.h>
#include <sys/sysmacros.h>

#include <cerrno>

namespace files {
namespace {

constexpr uint32_t kPermissions = 07777;

ItemType typeOf(const struct statx& info, bool isNamed) {
  if (isNamed && (info.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0) {
    return ItemType::kMount;
  }
  return S_ISREG(info.stx_mode)   ? ItemType::kFile
         : S_ISDIR(info.stx_mode) ? ItemType::kFolder
         : S_ISLNK(info.stx_mode) ? ItemType::kLink
                                  : ItemType::kSpecial;
}

}  // namespace

const char* wordOf(ItemType type) {
  switch (type) {
    case ItemType::kFile:
      return "file";
    case ItemType::kFolder:
      return "folder";
    case ItemType::kLink:
      return "link";
    case ItemType::kMount:
      return "mount";
    default:
      return "special";
  }
}

int lookAt(int folder, const std::string& name, Item& item) {
  struct statx info {};
  const int flags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | (name.empty() ? AT_EMPTY_PATH : 0);
  if (statx(folder, name.c_str(), flags, STATX_BASIC_STATS | STATX_MNT_ID, &info) != 0) {
    return errno;
  }
  Item seen;
  seen.name = name;
  seen.type = typeOf(info, !name.empty());
  if (seen.type != ItemType::kMount) {  // what is mounted is another's
    seen.size = seen.IsFile() ? info.stx_size : 0;
    seen.mtime = info.stx_mtime.tv_sec;
    seen.mtimeNanoseconds = info.stx_mtime.tv_nsec;
    seen.mode = info.stx_mode & kPermissions;
    seen.uid = info.stx_uid;
    seen.gid = info.stx_gid;
    seen.links = info.stx_nlink;
    seen.device = makedev(info.stx_dev_major, info.stx_dev_minor);
    seen.inode = info.stx_ino;
    seen.mount = info.stx_mnt_id;
  }
  item = seen;
  return 0;
}

}  // namespace files
