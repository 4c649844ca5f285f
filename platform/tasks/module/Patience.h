#pragma once

#include <cstdint>

struct sqlite3;

namespace QELO::Platform {

/// An end to waiting for a store while it lives. Without one SQLite waits for a reader's place in
/// the log for ten seconds whatever it is told, and for as long as the kernel lets a lease on a
/// file last. One at a time.
class Patience {
 public:
  explicit Patience(int milliseconds);
  Patience(const Patience&) = delete;
  Patience& operator=(const Patience&) = delete;
  ~Patience();

  /// Milliseconds that are left of the one that lives; without one, of no end.
  static int64_t Left();

  /// Name of the file system by which databases keep to it.
  static const char* FileSystem();
};

/// Whether the database's last operation failed since others hold it.
bool isHeldByOthers(sqlite3* database);

}  // namespace QELO::Platform
