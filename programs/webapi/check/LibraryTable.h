#pragma once

#include <string>
#include <vector>

namespace QELO::AuthorProgram {

/// The table of methods of an API library.
class LibraryTable {
 public:
  static constexpr int kUsualSeconds = 10;       ///< that loading may take
  static constexpr size_t kMostEntries = 10000;  ///< of a table

  struct Entry {
    std::string api;
    int version = 0;
    std::string method;
  };

  /// Loads a library in a process of its own, which has no rights but to read when the caller is
  /// root, no standard streams and little time, and reads the table.
  /// @param seconds  that it may take
  /// @return what is wrong with it, or ""
  std::string Read(const std::string& path, int seconds);

  bool Has(const std::string& api, int version, const std::string& method) const;
  const std::vector<Entry>& Entries() const { return entries_; }

 private:
  std::vector<Entry> entries_;
};

}  // namespace QELO::AuthorProgram
