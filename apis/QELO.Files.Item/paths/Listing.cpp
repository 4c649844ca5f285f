#include "paths/Listing.h"

#include <algorithm>
#include <utility>

#include "paths/Entries.h"
#include "paths/VirtualPath.h"

namespace files {
namespace {

char lower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// The place behind the character at `at`.
size_t afterCharacter(std::string_view text, size_t at) {
  do {
    ++at;
  } while (at < text.size() && (static_cast<unsigned char>(text[at]) & 0xC0) == 0x80);
  return at;
}

/// By name whatever the case; equal ones by their bytes.
int compareNames(const std::string& left, const std::string& right) {
  const size_t common = std::min(left.size(), right.size());
  for (size_t i = 0; i < common; ++i) {
    const auto l = static_cast<unsigned char>(lower(left[i]));
    const auto r = static_cast<unsigned char>(lower(right[i]));
    if (l != r) {
      return l < r ? -1 : 1;
    }
  }
  return left.size() != right.size() ? (left.size() < right.size() ? -1 : 1) : left.compare(right);
}

class Before {
 public:
  explicit Before(const Listing::Wish& wish) : wish_(wish) {}

  bool operator()(const Item& left, const Item& right) const {
    const int order = Compare(left, right);
    return wish_.descending ? order > 0 : order < 0;
  }

 private:
  int Compare(const Item& left, const Item& right) const {
    switch (wish_.order) {
      case Listing::Order::kSize:
        if (left.size != right.size) {
          return left.size < right.size ? -1 : 1;
        }
        break;
      case Listing::Order::kTime:
        if (TimeOf(left) != TimeOf(right)) {
          return TimeOf(left) < TimeOf(right) ? -1 : 1;
        }
        break;
      case Listing::Order::kType:
        if (left.type != right.type) {
          return std::string_view(wordOf(left.type)) < wordOf(right.type) ? -1 : 1;
        }
        break;
      default:
        break;
    }
    return compareNames(left.name, right.name);
  }

  static std::pair<int64_t, uint32_t> TimeOf(const Item& item) {
    return {item.mtime, item.mtimeNanoseconds};
  }

  const Listing::Wish& wish_;
};

bool isWanted(Listing::Kind kind, const Item& item) {
  return kind == Listing::Kind::kAll || (kind == Listing::Kind::kFolders) == item.IsFolder();
}

/// Keeps the first items in their order: the last of them is at the top of the heap.
class Page {
 public:
  explicit Page(const Listing::Wish& wish)
      : before_(wish), most_(size_t{wish.offset} + wish.limit) {}

  void Add(Item&& item) {
    if (items_.size() < most_) {
      items_.push_back(std::move(item));
      std::push_heap(items_.begin(), items_.end(), before_);
    } else if (most_ != 0 && before_(item, items_.front())) {
      std::pop_heap(items_.begin(), items_.end(), before_);
      items_.back() = std::move(item);
      std::push_heap(items_.begin(), items_.end(), before_);
    }
  }

  std::vector<Item> Take(unsigned offset) {
    std::sort_heap(items_.begin(), items_.end(), before_);
    items_.erase(items_.begin(), items_.begin() + std::min<ptrdiff_t>(offset, std::ssize(items_)));
    return std::move(items_);
  }

 private:
  Before before_;
  size_t most_;
  std::vector<Item> items_;
};

bool isShown(const std::string& name, const std::string& pattern) {
  return !isTemporaryName(name) && (pattern.empty() || matches(pattern, name));
}

}  // namespace

bool matches(std::string_view pattern, std::string_view name) {
  size_t p = 0;
  size_t n = 0;
  size_t star = std::string_view::npos;
  size_t retry = 0;  // where the text of the last star may end next
  while (n < name.size()) {
    if (p < pattern.size() && pattern[p] == '*') {
      star = p++;
      retry = n;
    } else if (p < pattern.size() && pattern[p] == '?') {
      ++p;
      n = afterCharacter(name, n);
    } else if (p < pattern.size() && lower(pattern[p]) == lower(name[n])) {
      ++p;
      ++n;
    } else if (star != std::string_view::npos) {
      p = star + 1;
      n = ++retry;
    } else {
      return false;
    }
  }
  return pattern.find_first_not_of('*', p) == std::string_view::npos;
}

Reason Listing::Read(const Folder& folder, const Wish& wish, std::vector<Item>& items,
                     uint64_t& total) {
  Entries entries;
  if (const Reason reason = entries.Open(folder); reason != Reason::kNone) {
    return reason;
  }
  const bool looksAtAll = wish.order != Order::kName || wish.kind != Kind::kAll;
  Page page(wish);
  uint64_t count = 0;
  Item item;
  while (entries.Next(item.name)) {
    // One that is gone by now is no longer an item.
    if (isShown(item.name, wish.pattern) &&
        (!looksAtAll || folder.Look(item.name, item) == Reason::kNone) &&
        isWanted(wish.kind, item)) {
      ++count;
      page.Add(std::exchange(item, Item()));
    }
  }
  if (entries.Fault() != Reason::kNone) {
    return entries.Fault();
  }
  items = page.Take(wish.offset);
  if (!looksAtAll) {
    std::erase_if(items, [&](Item& shown) {
      return folder.Look(std::string(shown.name), shown) != Reason::kNone;
    });
  }
  total = count;
  return Reason::kNone;
}

}  // namespace files
