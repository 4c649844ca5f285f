#include <sys/statvfs.h>

#include <cstring>
#include <string>
#include <string_view>

#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "webapi/platform/Core.h"

namespace {

bool hasRoom(const std::string& path, unsigned long long size) {
  struct statvfs info {};
  return statvfs(path.c_str(), &info) == 0 &&
         static_cast<unsigned long long>(info.f_bavail) * info.f_frsize >= size;
}

}  // namespace

extern "C" {

int VolumeAvailGet(unsigned long long size, QELOVolumeRecord* volume) {
  const std::string names = QELO::Platform::Settings().Get("volumes", "");
  for (std::string_view rest = names; !rest.empty();) {
    const size_t end = rest.find_first_of(", \t");
    const std::string_view name = rest.substr(0, end);
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
    const std::string path = QELO::Paths::kRootPrefix + std::string(name);
    if (name.starts_with('/') && path.size() < sizeof volume->path && hasRoom(path, size)) {
      memcpy(volume->path, path.c_str(), path.size() + 1);
      return 1;
    }
  }
  return 0;
}

}  // extern "C"
