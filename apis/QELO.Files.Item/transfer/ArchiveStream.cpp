#include "transfer/ArchiveStream.h"

#include <unistd.h>
#include <webapi/JsonHelper.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <utility>

#include "transfer/Library.h"

namespace files {
namespace {

constexpr size_t kPiece = 256 << 10;  ///< bytes of a file that are read at once
constexpr char kLibrary[] = "QELO.Files.Archive.so";

}  // namespace

ArchiveStream::ArchiveStream(const Shares& shares, std::vector<VirtualPath> items)
    : shares_(shares), items_(std::move(items)) {}

std::FILE* ArchiveStream::Open(const std::string& libraries) {
  const auto make =
      reinterpret_cast<MakeArchiveWriter>(findInLibrary(libraries, kLibrary, kMakeArchiveWriter));
  writer_.reset(make != nullptr ? make(&out_) : nullptr);
  if (writer_ == nullptr) {
    return nullptr;
  }
  cookie_io_functions_t functions{};
  functions.read = [](void* stream, char* buffer, size_t size) {
    return static_cast<ArchiveStream*>(stream)->Read(buffer, size);
  };
  return fopencookie(this, "r", functions);
}

ssize_t ArchiveStream::Read(char* buffer, size_t size) {
  while (taken_ == out_.size() && !isFinished_) {
    out_.clear();
    taken_ = 0;
    if (!Step()) {
      errno = EIO;
      return -1;
    }
  }
  const size_t count = std::min(size, out_.size() - taken_);
  out_.copy(buffer, count, taken_);
  taken_ += count;
  return static_cast<ssize_t>(count);
}

bool ArchiveStream::Step() {
  if (left_ > 0) {
    return CopySome();
  }
  file_ = Descriptor();
  if (levels_.empty()) {
    return NextItem();
  }
  Level& level = *levels_.back();
  std::string name;
  if (level.entries.Next(name)) {
    return isTemporaryName(name) || Add(level.folder, name, level.name + name);
  }
  if (level.entries.Fault() != Reason::kNone) {
    Fail(level.name, level.entries.Fault());
  }
  levels_.pop_back();
  return true;
}

bool ArchiveStream::NextItem() {
  if (next_ == items_.size()) {
    return Finish();
  }
  const VirtualPath& path = items_[next_++];
  Located located;
  if (const Reason reason = locate(shares_, path, located); reason != Reason::kNone) {
    Fail(path.Name(), reason);
    return true;
  }
  if (!path.IsShare()) {
    return Add(located.parent, located.name, located.name);
  }
  Item item;
  located.parent.LookAtItself(item);
  return AddFolder(located.parent, item, path.Name());
}

bool ArchiveStream::Add(const Folder& folder, const std::string& name,
                        const std::string& shownName) {
  Item item;
  const Reason reason = folder.Look(name, item);
  if (reason != Reason::kNone || added_ == kMostItems) {
    Fail(shownName, reason != Reason::kNone ? reason : Reason::kTooMany);
    return true;
  }
  switch (item.type) {
    case ItemType::kFile:
      return AddFile(folder, name, shownName);
    case ItemType::kFolder: {
      Folder inner;
      if (const Reason refused = folder.Enter(name, inner); refused != Reason::kNone) {
        Fail(shownName, refused);
        return true;
      }
      return AddFolder(inner, item, shownName);
    }
    default:
      Fail(shownName, item.type == ItemType::kLink    ? Reason::kLink
                      : item.type == ItemType::kMount ? Reason::kMount
                                                      : Reason::kSpecial);
      return true;
  }
}

/// @param folder  the folder itself
bool ArchiveStream::AddFolder(const Folder& folder, const Item& item,
                              const std::string& shownName) {
  auto level = std::make_unique<Level>();
  Reason reason = levels_.size() < VirtualPath::kDeepestWalk ? Reason::kNone : Reason::kTooDeep;
  if (reason == Reason::kNone) {
    reason = folder.Enter(".", level->folder);
  }
  if (reason == Reason::kNone) {
    reason = level->entries.Open(level->folder);
  }
  if (reason != Reason::kNone) {
    Fail(shownName, reason);
    return true;
  }
  level->name = shownName + "/";
  levels_.push_back(std::move(level));
  ++added_;
  return writer_->AddFolder(QELO::JsonHelper::repairUtf8(shownName), item);
}

bool ArchiveStream::AddFile(const Folder& folder, const std::string& name,
                            const std::string& shownName) {
  Item item;
  if (const Reason reason = folder.OpenFile(name, file_, item); reason != Reason::kNone) {
    Fail(shownName, reason);
    return true;
  }
  fileName_ = shownName;
  left_ = item.size;
  ++added_;
  return writer_->AddFile(QELO::JsonHelper::repairUtf8(shownName), item);
}

/// The archive was told how long the file is: one that ends before is filled up.
bool ArchiveStream::CopySome() {
  static char piece[kPiece];
  const size_t size = std::min<uint64_t>(kPiece, left_);
  const ssize_t count = file_ ? TEMP_FAILURE_RETRY(read(file_.Get(), piece, size)) : 0;
  if (count <= 0) {
    if (file_) {
      Fail(fileName_, count < 0 ? reasonOf(errno) : Reason::kChanged);
      file_ = Descriptor();
    }
    std::fill_n(piece, size, '\0');
  }
  const size_t written = count > 0 ? static_cast<size_t>(count) : size;
  left_ -= written;
  return writer_->WriteData(piece, written);
}

bool ArchiveStream::Finish() {
  isFinished_ = true;
  if (!failed_.empty()) {
    Item text;
    text.size = failed_.size();
    text.mode = 0644;
    text.mtime = time(nullptr);
    if (!writer_->AddFile(kFailuresName, text) ||
        !writer_->WriteData(failed_.data(), failed_.size())) {
      return false;
    }
  }
  return writer_->Finish();
}

void ArchiveStream::Fail(const std::string& name, Reason reason) {
  if (failures_++ < kMostFailures) {
    failed_ += QELO::JsonHelper::repairUtf8(name) + ": " + wordOf(reason) + "\n";
  }
}

}  // namespace files
