#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <string>

namespace files {

enum class ItemType { kFile, kFolder, kLink, kMount, kSpecial };

/// What is known of a file, a folder or something else of a name.
struct Item {
  std::string name;
  ItemType type = ItemType::kSpecial;
  uint64_t size = 0;  ///< bytes of a file, else 0
  int64_t mtime = 0;  ///< seconds since 1970
  uint32_t mtimeNanoseconds = 0;
  uint32_t mode = 0;  ///< the twelve bits of permission
  uint32_t uid = 0;
  uint32_t gid = 0;
  uint32_t links = 0;
  uint64_t device = 0;
  uint64_t inode = 0;
  uint64_t mount = 0;  ///< between two of them nothing can be moved

  bool IsFile() const { return type == ItemType::kFile; }
  bool IsFolder() const { return type == ItemType::kFolder; }
  bool IsSameAs(const Item& other) const { return device == other.device && inode == other.inode; }
};

/// As clients see it: "file", "folder", "link", "mount" or "special".
const char* wordOf(ItemType type);

/// @return 0 or errno; `item` is then unchanged
/// @param name  "": the descriptor's own file, which is then no mount
int lookAt(int folder, const std::string& name, Item& item);

}  // namespace files
