#include "paths/Entries.h"

#include <cerrno>
#include <cstring>

namespace files {

Reason Entries::Open(const Folder& folder) {
  Descriptor descriptor;
  if (const Reason reason = folder.OpenForReading(descriptor); reason != Reason::kNone) {
    return reason;
  }
  stream_.reset(fdopendir(descriptor.Get()));
  if (stream_ == nullptr) {
    return reasonOf(errno);
  }
  descriptor.Release();
  return Reason::kNone;
}

bool Entries::Next(std::string& name) {
  errno = 0;
  const dirent* entry = readdir(stream_.get());
  while (entry != nullptr &&
         (strcmp(entry->d_name, ".") == 0 || strcmp(entry->d_name, "..") == 0)) {
    entry = readdir(stream_.get());
  }
  if (entry == nullptr) {
    fault_ = reasonOf(errno);
    return false;
  }
  name = entry->d_name;
  return true;
}

void Entries::Rewind() {
  rewinddir(stream_.get());
  fault_ = Reason::kNone;
}

}  // namespace files
