#pragma once

#include <json/json.h>

#include <istream>
#include <string>
#include <vector>

namespace hostinfo {

struct Mount {
  std::string device;      ///< major:minor
  std::string mountPoint;  ///< unescaped
  std::string type;
  std::string source;
};

/// The mounts in a text of the form of /proc/self/mountinfo; malformed lines are left out.
std::vector<Mount> ReadMounts(std::istream& text);

/// The volumes of this host: file systems on block devices and the one that holds `directory`,
/// each once, at its shortest mount point, as {"mountPoint", "fileSystem", "total", "free"} with
/// sizes in bytes; "free" is what ordinary users can still fill.
Json::Value Volumes(const std::string& directory);

}  // namespace hostinfo
