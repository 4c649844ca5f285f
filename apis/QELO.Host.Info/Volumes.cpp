#include "Volumes.h"

#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/sysmacros.h>

#include <fstream>
#include <map>
#include <sstream>

namespace hostinfo {
namespace {

bool IsOctal(const std::string& text, size_t at) {
  for (size_t i = at; i < at + 3; ++i) {
    if (i >= text.size() || text[i] < '0' || text[i] > '7') {
      return false;
    }
  }
  return true;
}

/// Blanks and the like stand in mountinfo as a backslash and three octal digits.
std::string Unescape(const std::string& text) {
  std::string plain;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '\\' && IsOctal(text, i + 1)) {
      plain += static_cast<char>((text[i + 1] - '0') * 64 + (text[i + 2] - '0') * 8 +
                                 (text[i + 3] - '0'));
      i += 3;
    } else {
      plain += text[i];
    }
  }
  return plain;
}

bool ReadMount(const std::string& line, Mount& mount) {
  std::istringstream fields(line);
  std::string skipped;
  if (!(fields >> skipped >> skipped >> mount.device >> skipped >> mount.mountPoint)) {
    return false;
  }
  while (fields >> skipped && skipped != "-") {
  }
  if (!(fields >> mount.type >> mount.source)) {
    return false;
  }
  mount.mountPoint = Unescape(mount.mountPoint);
  mount.source = Unescape(mount.source);
  return true;
}

std::string DeviceOf(const std::string& path) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) {
    return "";
  }
  return std::to_string(major(info.st_dev)) + ":" + std::to_string(minor(info.st_dev));
}

bool IsDirectory(const std::string& path) {
  struct stat info {};
  return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

bool Describe(const Mount& mount, Json::Value& volume) {
  struct statvfs info {};
  if (statvfs(mount.mountPoint.c_str(), &info) != 0) {
    return false;
  }
  volume["mountPoint"] = mount.mountPoint;
  volume["fileSystem"] = mount.type;
  volume["total"] = static_cast<Json::UInt64>(info.f_blocks) * info.f_frsize;
  volume["free"] = static_cast<Json::UInt64>(info.f_bavail) * info.f_frsize;
  return true;
}

}  // namespace

std::vector<Mount> ReadMounts(std::istream& text) {
  std::vector<Mount> mounts;
  for (std::string line; std::getline(text, line);) {
    Mount mount;
    if (ReadMount(line, mount)) {
      mounts.push_back(mount);
    }
  }
  return mounts;
}

Json::Value Volumes(const std::string& directory) {
  std::ifstream file("/proc/self/mountinfo");
  const std::string own = DeviceOf(directory);
  std::map<std::string, Mount> chosen;
  for (const Mount& mount : ReadMounts(file)) {
    const bool real = mount.source.compare(0, 5, "/dev/") == 0 || mount.device == own;
    if (!real || !IsDirectory(mount.mountPoint)) {
      continue;
    }
    const auto [it, isNew] = chosen.emplace(mount.device, mount);
    if (!isNew && mount.mountPoint.size() < it->second.mountPoint.size()) {
      it->second = mount;
    }
  }
  Json::Value volumes(Json::arrayValue);
  for (const auto& [device, mount] : chosen) {
    Json::Value volume(Json::objectValue);
    if (Describe(mount, volume)) {
      volumes.append(volume);
    }
  }
  return volumes;
}

}  // namespace hostinfo
