#include "programs/server/Listener.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "webapi/base/OwnFile.h"
#include "webapi/platform/Core.h"

namespace QELO {
namespace {

constexpr int kBacklog = 1024;
constexpr mode_t kDirectoryMode = 0755;
constexpr int kType = SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK;

bool makeAddress(const std::string& path, sockaddr_un& address) {
  if (path.empty() || path.size() >= sizeof address.sun_path) {
    errno = ENAMETOOLONG;
    return false;
  }
  address.sun_family = AF_UNIX;
  memcpy(address.sun_path, path.data(), path.size());
  return true;
}

const sockaddr* general(const sockaddr_un& address) {
  return reinterpret_cast<const sockaddr*>(&address);
}

/// The directory that a path stands in.
std::string placeOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

bool prepareDirectory(const std::string& place) {
  struct stat info {};
  if (stat(place.c_str(), &info) != 0 &&
      QELOFSMkdirP(place.c_str(), 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
                   kDirectoryMode) != 0) {
    return false;
  }
  if (stat(place.c_str(), &info) != 0) {
    return false;
  }
  if (!IsOwnFile(info)) {
    errno = EPERM;
    return false;
  }
  return true;
}

/// Removes the socket that a server has left which is gone.
bool clearPlace(const std::string& path, const sockaddr_un& address) {
  struct stat info {};
  if (lstat(path.c_str(), &info) != 0) {
    return errno == ENOENT;
  }
  const UniqueFd probe(socket(AF_UNIX, kType, 0));
  const bool isLeft = S_ISSOCK(info.st_mode) && probe &&
                      connect(probe.Get(), general(address), sizeof address) != 0 &&
                      errno == ECONNREFUSED;
  if (!isLeft) {
    errno = EADDRINUSE;
    return false;
  }
  return unlink(path.c_str()) == 0;
}

/// Nobody can connect before it has its owner.
bool bindTo(int descriptor, const std::string& path, const sockaddr_un& address,
            const Listener::Access& access) {
  const mode_t former = umask(0777);
  const bool bound = bind(descriptor, general(address), sizeof address) == 0;
  const int error = errno;
  umask(former);
  errno = error;
  const bool isOther =
      access.owner != static_cast<uid_t>(-1) || access.group != static_cast<gid_t>(-1);
  return bound && (!isOther || lchown(path.c_str(), access.owner, access.group) == 0) &&
         chmod(path.c_str(), access.mode) == 0;
}

}  // namespace

Listener::Listener(UniqueFd socket, std::string path, bool isOurs)
    : socket_(std::move(socket)), path_(std::move(path)) {
  struct stat info {};
  if (isOurs && lstat(path_.c_str(), &info) == 0) {
    device_ = info.st_dev;
    inode_ = info.st_ino;
  }
}

Listener& Listener::operator=(Listener&& other) noexcept {
  if (this != &other) {
    Remove();
    socket_ = std::move(other.socket_);
    path_ = std::move(other.path_);
    device_ = other.device_;
    inode_ = other.inode_;
  }
  return *this;
}

Listener::~Listener() {
  Remove();
}

void Listener::Remove() {
  struct stat info {};
  if (socket_ && inode_ != 0 && lstat(path_.c_str(), &info) == 0 && info.st_dev == device_ &&
      info.st_ino == inode_) {
    unlink(path_.c_str());
  }
}

std::optional<Listener> Listener::AtPath(const std::string& path, const Access& access) {
  sockaddr_un address{};
  if (!makeAddress(path, address) || !prepareDirectory(placeOf(path)) ||
      !clearPlace(path, address)) {
    return std::nullopt;
  }
  UniqueFd made(socket(AF_UNIX, kType, 0));
  if (!made || !bindTo(made.Get(), path, address, access) || listen(made.Get(), kBacklog) != 0) {
    return std::nullopt;
  }
  return Listener(std::move(made), path, true);
}

std::optional<Listener> Listener::AtPort(unsigned short port) {
  UniqueFd made(socket(AF_INET, kType, 0));
  const int yes = 1;
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(port);
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  if (!made || setsockopt(made.Get(), SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes) != 0 ||
      bind(made.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      listen(made.Get(), kBacklog) != 0) {
    return std::nullopt;
  }
  return Listener(std::move(made), "", false);
}

std::optional<Listener> Listener::Handed(int descriptor) {
  int isListening = 0;
  socklen_t size = sizeof isListening;
  if (getsockopt(descriptor, SOL_SOCKET, SO_ACCEPTCONN, &isListening, &size) != 0 ||
      isListening == 0 || fcntl(descriptor, F_SETFD, FD_CLOEXEC) != 0 ||
      fcntl(descriptor, F_SETFL, fcntl(descriptor, F_GETFL) | O_NONBLOCK) != 0) {
    return std::nullopt;
  }
  sockaddr_un address{};
  socklen_t length = sizeof address;
  std::string path;
  if (getsockname(descriptor, reinterpret_cast<sockaddr*>(&address), &length) == 0 &&
      address.sun_family == AF_UNIX) {
    path.assign(address.sun_path, strnlen(address.sun_path, sizeof address.sun_path));
  }
  return Listener(UniqueFd(descriptor), path, false);
}

}  // namespace QELO
