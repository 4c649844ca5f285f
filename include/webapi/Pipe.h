#pragma once

#include <json/json.h>

#include <cstddef>

#include "webapi/Export.h"

namespace QELO {

/// One anonymous pipe between a parent and a forked child, which carries one JSON value from the
/// writing to the reading side.
///
/// A message is a 32-bit length in the machine's byte order and the JSON text, each written and
/// read by one call. That needs room for all of it, which ordinary pipes have for 64 KiB. So a
/// privileged process makes the pipe large from the start, and an ordinary one when a message asks
/// for it, as far as the system lets it: up to /proc/sys/fs/pipe-max-size. Where root itself is
/// kept to that limit, as in containers without CAP_SYS_RESOURCE, a local socket pair takes the
/// pipe's place: its writer waits for a reader that is slow, so who writes must hold nothing else
/// that the reader waits for.
///
/// A call that a signal interrupts before it has done anything is made again; one that moved fewer
/// bytes than asked is a failure.
class WEBAPI_API Pipe {
 public:
  /// Room in bytes that Init() gives a message, its length included, when the process is root,
  /// whatever its writer is allowed to do later.
  static constexpr int kPrivilegedRoom = 16 << 20;

  /// Not open: Init() opens it, before the fork.
  Pipe();
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;
  /// Closes both ends.
  virtual ~Pipe();

  /// Opens both ends, close-on-exec. A pipe that was open before is closed.
  /// @return false, and the ends as they were, on failure
  bool Init();
  /// As Init(), for any output rather than for messages: always a pipe, of the ordinary size.
  bool InitStream();
  /// Keeps the read end alone. @param fd  0 or more: descriptor to put it on as well, which is left
  ///        to programs that are started
  void ReadOnly(int fd);
  /// Keeps the write end alone. @param fd  0 or more: descriptor to put it on as well
  void WriteOnly(int fd);
  void Close();

  /// One read of up to `size` bytes into `buffer`, zero-filled before. @return as read(2)
  int Read(char* buffer, int size);
  /// Sends one value. @return false when it was not written whole. A value without room, or one
  ///         nested deeper than JsonHelper::kMaxDepth (logged), which no reader takes, is not
  ///         begun: another may be sent instead.
  bool WriteJson(const Json::Value& value);
  /// Whether a message was begun since the pipe was opened, be it cut short.
  bool HasWritten() const { return hasWritten_; }
  /// Whether somebody could read what is sent: false when the write end is not open here, too.
  bool HasReader() const;
  /// Waits for one value. @return false, with the reason logged, when none arrives whole
  bool ReadJson(Json::Value& value);

 private:
  void Take(const int (&ends)[2]);
  bool HasRoomFor(size_t size);

  int readEnd_;
  int writeEnd_;
  bool hasWritten_;
};

}  // namespace QELO
