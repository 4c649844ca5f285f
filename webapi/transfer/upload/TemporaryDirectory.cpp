#include "webapi/transfer/upload/TemporaryDirectory.h"

#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/types.h>

#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"

namespace QELO {
namespace {

constexpr char kSource[] = "APIUpload.cpp";
constexpr int kNoRoom = 10496;
constexpr int kNotMade = 3072;
/// Bytes that an upload leaves free on the file system of "/", which the system itself needs.
constexpr unsigned long long kSystemReserve = 200ULL << 20;
/// For everybody. Others may not remove what is not theirs: the sticky bit.
constexpr mode_t kSharedMode = S_ISVTX | S_IRWXU | S_IRWXG | S_IRWXO;

void makeDirectory(const std::string& path) {
  QELOFSMkdirP(path.c_str(), 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1), kSharedMode);
}

bool hasFree(const char* path, unsigned long long size) {
  struct statvfs64 info {};
  const bool isKnown = statvfs64(path, &info) == 0;
  const bool hasRoom =
      isKnown && static_cast<unsigned long long>(info.f_bfree) * info.f_frsize >= size;
  if (!hasRoom) {
    QLIBCErrSetEx(kNoRoom, kSource, __LINE__);
  }
  return hasRoom;
}

bool chooseVolume(unsigned long long size, std::string& directory) {
  QELOVolumeRecord volume{};
  if (QLIBCFileCheckKeyValue(Paths::kSystemInfoDefaults, "tinyunit", "yes", 0) != 0) {
    return false;
  }
  if (VolumeAvailGet(size, &volume) != 1) {
    QLIBCErrSetEx(kNoRoom, kSource, __LINE__);
    return false;
  }
  directory = std::string(volume.path) + "/@tmp";
  makeDirectory(directory);
  return true;
}

}  // namespace

bool ChooseTemporaryDirectory(unsigned long long size, std::string& directory) {
  if (chooseVolume(size, directory)) {
    return true;
  }
  if (hasFree(Paths::kTmp, size)) {
    directory = Paths::kTmp;
    return true;
  }
  if (!hasFree(Paths::kRoot, size + kSystemReserve)) {
    return false;
  }
  if (QELOFSMkdirP(Paths::kVarTmp, 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1), S_IRWXU) !=
      0) {
    QLIBCErrSetEx(kNotMade, kSource, __LINE__);
    return false;
  }
  directory = Paths::kVarTmp;
  return true;
}

}  // namespace QELO
