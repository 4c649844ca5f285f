#include "Tree.h"

#include <fts.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <utility>

namespace checksum {
namespace {

struct Close {
  void operator()(FTS* walk) const { fts_close(walk); }
};

int byName(const FTSENT** left, const FTSENT** right) {
  return strcmp((*left)->fts_name, (*right)->fts_name);
}

}  // namespace

Tree::Tree(std::string directory, bool oneFileSystem)
    : directory_(std::move(directory)), oneFileSystem_(oneFileSystem) {}

std::string Tree::NameOf(const char* path) const {
  std::string name = path;
  name.erase(0, std::min(name.size(), directory_.size()));
  name.erase(0, name.find_first_not_of('/'));
  return name.empty() ? "." : name;
}

void Tree::Walk(const std::function<void(const File&)>& file,
                const std::function<void(const std::string&, int)>& error) const {
  std::string start = directory_;
  char* const starts[] = {start.data(), nullptr};
  const int flags = FTS_PHYSICAL | (oneFileSystem_ ? FTS_XDEV : 0);
  const std::unique_ptr<FTS, Close> walk(fts_open(starts, flags, byName));
  if (walk == nullptr) {
    error(".", errno);
    return;
  }
  errno = 0;
  while (const FTSENT* entry = fts_read(walk.get())) {
    switch (entry->fts_info) {
      case FTS_F:
        file({NameOf(entry->fts_path), entry->fts_accpath,
              static_cast<uint64_t>(entry->fts_statp->st_size)});
        break;
      case FTS_DNR:
      case FTS_ERR:
      case FTS_NS:
        error(NameOf(entry->fts_path), entry->fts_errno);
        break;
      case FTS_DC:
        error(NameOf(entry->fts_path), ELOOP);
        break;
      default:
        break;
    }
    errno = 0;
  }
  if (errno != 0) {  // the walk could not go on
    error(".", errno);
  }
}

}  // namespace checksum
