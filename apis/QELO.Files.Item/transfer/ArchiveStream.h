#pragma once

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "paths/Entries.h"
#include "paths/Located.h"
#include "transfer/ArchiveWriter.h"

namespace files {

/// An archive of some items, written while it is read, in fixed memory but for its table of
/// contents. What cannot be read is left out, and a text at the archive's end says what and why.
class ArchiveStream {
 public:
  static constexpr unsigned kMostItems = 100 * 1000;  ///< each stands in the table of contents
  static constexpr unsigned kMostFailures = 1000;     ///< told ones
  static constexpr char kFailuresName[] = "left-out.txt";

  /// @param shares  must outlive this
  ArchiveStream(const Shares& shares, std::vector<VirtualPath> items);

  /// A stream to read the archive from, the caller's to close before this goes; null when the
  /// library that writes archives is not there.
  /// @param libraries  the directory of that library
  std::FILE* Open(const std::string& libraries);

 private:
  /// A folder that the walk is in.
  struct Level {
    Folder folder;
    Entries entries;
    std::string name;  ///< within the archive, with a "/" at the end
  };

  ssize_t Read(char* buffer, size_t size);
  /// Adds some bytes. @return false when the archive cannot be gone on with
  bool Step();
  bool Add(const Folder& folder, const std::string& name, const std::string& shownName);
  bool AddFolder(const Folder& folder, const Item& item, const std::string& shownName);
  bool AddFile(const Folder& folder, const std::string& name, const std::string& shownName);
  bool CopySome();
  bool NextItem();
  bool Finish();
  void Fail(const std::string& name, Reason reason);

  const Shares& shares_;
  std::vector<VirtualPath> items_;
  size_t next_ = 0;
  std::vector<std::unique_ptr<Level>> levels_;
  Descriptor file_;  ///< the one that is being copied
  std::string fileName_;
  uint64_t left_ = 0;  ///< bytes of it
  unsigned added_ = 0;
  unsigned failures_ = 0;
  std::string failed_;  ///< the text at the end
  std::string out_;
  size_t taken_ = 0;  ///< bytes of `out_`
  bool isFinished_ = false;
  std::unique_ptr<ArchiveWriter> writer_;
};

}  // namespace files
