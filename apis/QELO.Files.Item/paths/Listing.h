#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "paths/Folder.h"

namespace files {

/// Whether a name matches a pattern: "*" is any text, "?" any one character, letters of ASCII in
/// either case. Takes at most the product of both lengths.
bool matches(std::string_view pattern, std::string_view name);

/// One page of a folder's items, sorted. Keeps no more items than the page's end, however many the
/// folder holds.
class Listing {
 public:
  static constexpr unsigned kMostItems = 5000;       ///< of a page
  static constexpr unsigned kFarthest = 100 * 1000;  ///< items up to a page's end
  static constexpr size_t kLongestPattern = 255;     ///< bytes

  enum class Order { kName, kSize, kTime, kType };
  enum class Kind { kAll, kFiles, kFolders };

  struct Wish {
    Order order = Order::kName;
    bool descending = false;
    Kind kind = Kind::kAll;
    std::string pattern;  ///< "": all
    unsigned offset = 0;
    unsigned limit = 0;
  };

  /// Reads the whole folder. The API's temporary files are left out.
  /// @param items  the page
  /// @param total  how many items there are on all pages
  static Reason Read(const Folder& folder, const Wish& wish, std::vector<Item>& items,
                     uint64_t& total);
};

}  // namespace files
