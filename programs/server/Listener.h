#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

#include "webapi/base/FileIdentity.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {

/// A socket that connections are accepted from. One that was made at a path is removed from there
/// at the end, unless another has taken the place.
class Listener {
 public:
  /// Who may connect: the socket's owner, group and mode; (uid_t)-1 and (gid_t)-1 leave ours.
  struct Access {
    uid_t owner = static_cast<uid_t>(-1);
    gid_t group = static_cast<gid_t>(-1);
    mode_t mode = 0600;
  };

  /// Makes a local socket. Its directory is made when missing, and must be one that nobody else
  /// may write; what a server that is gone has left there is replaced.
  /// @return none, with errno: EADDRINUSE when another server listens there, or something else than
  ///         a socket is there; EPERM for the directory
  static std::optional<Listener> AtPath(const std::string& path, const Access& access);
  /// Makes a socket on the loopback address. @param port  0: one that is free
  static std::optional<Listener> AtPort(unsigned short port);
  /// Takes a listening socket that somebody else has made. @return none, when it is none
  static std::optional<Listener> Handed(int descriptor);

  Listener(Listener&& other) noexcept = default;
  Listener& operator=(Listener&& other) noexcept;
  ~Listener();

  int Descriptor() const { return socket_.Get(); }
  /// Whether it was made here, and not handed.
  bool IsOurs() const { return inode_ != 0; }
  /// The socket's path; "" for one of another kind.
  const std::string& Path() const { return path_; }

 private:
  Listener(UniqueFd socket, std::string path, bool isOurs);
  void Remove();

  UniqueFd socket_;
  std::string path_;
  dev_t device_ = 0;
  ino_t inode_ = 0;  ///< of the file that is ours; 0: none
};

}  // namespace QELO
