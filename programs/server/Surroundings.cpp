#include "programs/server/Surroundings.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "programs/server/ServiceManager.h"
#include "webapi/base/NullDevice.h"

namespace QELO {
namespace {

constexpr mode_t kUmask = 022;
constexpr char kPath[] = "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin";
/// What the service manager tells, and what decides how texts and times are shown.
constexpr const char* kKept[] = {"LANG",       "LC_ALL",        "TZ", "NOTIFY_SOCKET", "LISTEN_FDS",
                                 "LISTEN_PID", "LISTEN_FDNAMES"};

void cleanEnvironment() {
  std::vector<std::pair<const char*, std::string>> kept;
  for (const char* name : kKept) {
    if (const char* value = getenv(name)) {
      kept.emplace_back(name, value);
    }
  }
  clearenv();
  for (const auto& [name, value] : kept) {
    setenv(name, value.c_str(), 1);
  }
  setenv("PATH", kPath, 1);
}

}  // namespace

std::vector<int> PrepareServer() {
  for (int descriptor = STDIN_FILENO; descriptor <= STDERR_FILENO; ++descriptor) {
    if (descriptor == STDIN_FILENO || fcntl(descriptor, F_GETFD) < 0) {
      PutNullOver({descriptor});
    }
  }
  std::vector<int> sockets = ServiceManager::TakeSockets();
  close_range(static_cast<unsigned>(sockets.empty() ? STDERR_FILENO : sockets.back()) + 1, UINT_MAX,
              0);
  umask(kUmask);
  cleanEnvironment();
  tzset();  // now, and not in each child
  return sockets;
}

}  // namespace QELO
