#pragma once

#include <cstdint>
#include <string>

#include "paths/Item.h"

namespace files {

/// Writes an archive into memory, piece by piece, for somebody to take away. Served by a library of
/// its own, which is loaded by who makes an archive: it brings a dozen others along.
///
/// An operation that fails is told by false; the archive cannot be gone on with then.
class ArchiveWriter {
 public:
  virtual ~ArchiveWriter() = default;

  /// @param name  within the archive, in UTF-8; parts are separated by "/"
  virtual bool AddFolder(const std::string& name, const Item& item) = 0;
  /// Begins a file of item.size bytes, which WriteData() gives, no more and no fewer.
  virtual bool AddFile(const std::string& name, const Item& item) = 0;
  virtual bool WriteData(const char* data, size_t size) = 0;
  virtual bool Finish() = 0;
};

/// What the library has: a ZIP archive that is appended to `out`, which must outlive it. Null when
/// there is no memory.
using MakeArchiveWriter = ArchiveWriter* (*)(std::string* out);
inline constexpr char kMakeArchiveWriter[] = "QeloFilesMakeArchiveWriter";

}  // namespace files
