#include "webapi/runner/library/PreloadedLibraries.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <link.h>
#include <malloc.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr time_t kSettledSeconds = 1;  ///< a file that was written later may be written still

/// What tells a file from the one that it was.
struct Version {
  dev_t device = 0;
  ino_t inode = 0;
  off_t size = 0;
  timespec written{};
  timespec changed{};

  explicit Version(const struct stat& info)
      : device(info.st_dev),
        inode(info.st_ino),
        size(info.st_size),
        written(info.st_mtim),
        changed(info.st_ctim) {}
  bool operator==(const Version& other) const {
    const auto same = [](const timespec& left, const timespec& right) {
      return left.tv_sec == right.tv_sec && left.tv_nsec == right.tv_nsec;
    };
    return device == other.device && inode == other.inode && size == other.size &&
           same(written, other.written) && same(changed, other.changed);
  }
};

struct Copy {
  Version version;
  void* handle;  ///< null: it could not be loaded
  time_t tried;  ///< when that was
};

/// What Find() has given and Close() has not had.
std::vector<void*>* taken = nullptr;
/// Null until the first is loaded: a process that loads none pays nothing.
std::map<std::string, Copy>* copies = nullptr;
/// Each copy's memory. Kept open, since the loader knows a copy by the descriptor's number.
std::vector<UniqueFd>* memories = nullptr;

std::optional<Version> versionOf(const std::string& path) {
  struct stat info {};
  return stat(path.c_str(), &info) == 0 ? std::optional(Version(info)) : std::nullopt;
}

std::string nameOf(const UniqueFd& memory) {
  return "/proc/self/fd/" + std::to_string(memory.Get());
}

/// @return nothing, with errno, when the file cannot be copied
UniqueFd copyOf(const std::string& path) {
  UniqueFd file;
  struct stat info {};
  std::string text;
  errno = OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0);
  if (!file || !ReadText(file.Get(), PreloadedLibraries::kLargest, text)) {
    return UniqueFd();
  }
  UniqueFd memory(memfd_create("api library", MFD_CLOEXEC));
  return memory && WriteText(memory.Get(), text) ? std::move(memory) : UniqueFd();
}

/// Whether a process of its own survives the loading.
bool canBeLoaded(const std::string& name) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(dlopen(name.c_str(), RTLD_NOW) != nullptr ? 0 : 1);
  }
  int status = -1;
  return child > 0 && TEMP_FAILURE_RETRY(waitpid(child, &status, 0)) == child && status == 0;
}

/// @return why it was not loaded; "" when it was
std::string load(const std::string& path, Copy& copy) {
  if (OthersMayChange(path)) {
    return "others may write it or its directory";
  }
  if (copy.tried - copy.version.changed.tv_sec <= kSettledSeconds) {
    return "it was written just now";
  }
  if (memories->size() >= PreloadedLibraries::kMostCopies) {
    return "too many libraries were replaced";
  }
  UniqueFd memory = copyOf(path);
  const std::optional<Version> after = versionOf(path);
  if (!memory || !after || !(*after == copy.version)) {
    return "it cannot be copied";
  }
  const std::string name = nameOf(memory);
  if (!canBeLoaded(name)) {
    return "the loader refuses it";
  }
  memories->push_back(std::move(memory));
  copy.handle = dlopen(name.c_str(), RTLD_NOW);
  return copy.handle != nullptr ? "" : dlerror();
}

/// As the loader does: the array from its end to its start, then the single function.
void runDestructors(void* handle) {
  using Destructor = void (*)();
  const link_map* map = nullptr;
  if (dlinfo(handle, RTLD_DI_LINKMAP, &map) != 0) {
    return;
  }
  ElfW(Addr) array = 0;
  ElfW(Addr) single = 0;
  size_t count = 0;
  for (const ElfW(Dyn)* entry = map->l_ld; entry->d_tag != DT_NULL; ++entry) {
    switch (entry->d_tag) {
      case DT_FINI_ARRAY:
        array = map->l_addr + entry->d_un.d_ptr;
        break;
      case DT_FINI_ARRAYSZ:
        count = entry->d_un.d_val / sizeof(Destructor);
        break;
      case DT_FINI:
        single = map->l_addr + entry->d_un.d_ptr;
        break;
      default:
        break;
    }
  }
  while (array != 0 && count > 0) {
    reinterpret_cast<const Destructor*>(array)[--count]();
  }
  if (single != 0) {
    reinterpret_cast<Destructor>(single)();
  }
}

}  // namespace

bool PreloadedLibraries::Load(const std::string& path) {
  if (copies == nullptr) {
    copies = new std::map<std::string, Copy>;
    memories = new std::vector<UniqueFd>;
    taken = new std::vector<void*>;
  }
  const std::optional<Version> version = versionOf(path);
  if (!version) {
    WEBAPI_LOG("APIRunner.cpp", "not loaded ahead: %s [%m]", LogText(path).c_str());
    return false;
  }
  const auto known = copies->find(path);
  if (known != copies->end() && known->second.handle != nullptr &&
      known->second.version == *version) {
    return true;
  }
  Copy copy{*version, nullptr, time(nullptr)};
  const std::string fault = load(path, copy);
  if (!fault.empty()) {
    syslog(LOG_INFO, "%s:%d not loaded ahead: %s: %s", "APIRunner.cpp", __LINE__,
           LogText(path).c_str(), LogText(fault).c_str());
  }
  copies->insert_or_assign(path, copy);
  malloc_trim(0);  // each page that is kept, that of the file's text too, makes each fork dearer
  return copy.handle != nullptr;
}

void PreloadedLibraries::Refresh() {
  std::vector<std::string> changed;
  for (const auto& [path, copy] : copies != nullptr ? *copies : std::map<std::string, Copy>()) {
    const std::optional<Version> now = versionOf(path);
    const bool isSettled = now && time(nullptr) - now->changed.tv_sec > kSettledSeconds;
    const bool isOther = now && !(*now == copy.version);
    const bool wasTooFresh =
        copy.handle == nullptr && copy.version.changed.tv_sec + kSettledSeconds >= copy.tried;
    if (isSettled && (isOther || wasTooFresh)) {
      changed.push_back(path);
    }
  }
  for (const std::string& path : changed) {
    Load(path);
  }
}

void* PreloadedLibraries::Find(const std::string& path) {
  if (copies == nullptr) {
    return nullptr;
  }
  const auto found = copies->find(path);
  if (found == copies->end() || found->second.handle == nullptr) {
    return nullptr;
  }
  const std::optional<Version> now = versionOf(path);
  if (!now || !(*now == found->second.version)) {
    return nullptr;
  }
  taken->push_back(found->second.handle);
  return std::exchange(found->second.handle, nullptr);
}

bool PreloadedLibraries::Close(void* handle) {
  if (taken == nullptr || std::erase(*taken, handle) == 0) {
    return false;
  }
  runDestructors(handle);
  return true;
}

}  // namespace QELO
