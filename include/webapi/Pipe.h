#pragma once

#include <json/json.h>

#include "webapi/Export.h"

namespace QELO {

/// One anonymous pipe between a parent and a forked child, which carries one JSON value from the
/// writing to the reading side.
///
/// A message is a 32-bit length in the machine's byte order and the JSON text, each written and
/// read by one call. That needs room for all of it: the pipe is made large where the process may,
/// and WriteJson() makes it larger when it must and can.
class WEBAPI_API Pipe {
 public:
  /// Room in bytes that a pipe made by a privileged process has, whatever its writer may do later.
  /// A writer without privilege can raise a smaller pipe up to /proc/sys/fs/pipe-max-size.
  static constexpr int kPrivilegedCapacity = 16 << 20;

  Pipe();
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;
  /// Closes both ends.
  virtual ~Pipe();

  /// Opens both ends. @return false, and the ends as they were, on failure
  bool Init();
  /// Keeps the read end alone. @param fd  0 or more: descriptor to put it on as well
  void ReadOnly(int fd);
  /// Keeps the write end alone. @param fd  0 or more: descriptor to put it on as well
  void WriteOnly(int fd);
  void Close();

  /// One read of up to `size` bytes into `buffer`, zero-filled before. @return as read(2)
  int Read(char* buffer, int size);
  /// Sends one value. @return false when it was not written whole; when there is no room for it,
  ///         nothing was written, and a shorter value may be sent instead
  bool WriteJson(const Json::Value& value);
  /// Waits for one value. @return false, with the reason logged, when none arrives whole
  bool ReadJson(Json::Value& value);

 private:
  bool HasRoomFor(size_t size);

  int readEnd_;
  int writeEnd_;
};

}  // namespace QELO
