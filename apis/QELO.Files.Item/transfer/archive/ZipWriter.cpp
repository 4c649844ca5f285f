// ZIP archives by libarchive, a library of its own: see ArchiveWriter.h.

#include <archive.h>
#include <archive_entry.h>
#include <locale.h>
#include <sys/stat.h>
#include <clocale>

#include <memory>

#include "transfer/ArchiveWriter.h"

namespace files {
namespace {

/// Names are taken for the locale's; a CGI program has none.
class Utf8Locale {
 public:
  Utf8Locale()
      : locale_(newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr)), before_(uselocale(locale_)) {}
  Utf8Locale(const Utf8Locale&) = delete;
  Utf8Locale& operator=(const Utf8Locale&) = delete;
  ~Utf8Locale() {
    uselocale(before_);
    if (locale_ != nullptr) {
      freelocale(locale_);
    }
  }

 private:
  locale_t locale_;
  locale_t before_;
};

struct Free {
  void operator()(archive* writer) const { archive_write_free(writer); }
  void operator()(archive_entry* entry) const { archive_entry_free(entry); }
};

la_ssize_t append(archive*, void* out, const void* data, size_t size) {
  static_cast<std::string*>(out)->append(static_cast<const char*>(data), size);
  return static_cast<la_ssize_t>(size);
}

class ZipWriter : public ArchiveWriter {
 public:
  /// @return false when there is no memory
  bool Open(std::string* out) {
    const Utf8Locale names;
    writer_.reset(archive_write_new());
    entry_.reset(archive_entry_new());
    // Stored as they are: most of what is large is packed already, and packing costs the server
    // many times what sending does.
    return writer_ != nullptr && entry_ != nullptr &&
           archive_write_set_format_zip(writer_.get()) == ARCHIVE_OK &&
           archive_write_set_options(writer_.get(), "zip:compression=store") == ARCHIVE_OK &&
           archive_write_set_bytes_per_block(writer_.get(), 0) == ARCHIVE_OK &&
           archive_write_open(writer_.get(), out, nullptr, append, nullptr) == ARCHIVE_OK;
  }

  bool AddFolder(const std::string& name, const Item& item) override {
    return Add(name + "/", item, AE_IFDIR);
  }
  bool AddFile(const std::string& name, const Item& item) override {
    return Add(name, item, AE_IFREG);
  }
  bool WriteData(const char* data, size_t size) override {
    return archive_write_data(writer_.get(), data, size) == static_cast<la_ssize_t>(size);
  }
  bool Finish() override {
    const Utf8Locale names;
    return archive_write_close(writer_.get()) == ARCHIVE_OK;
  }

 private:
  bool Add(const std::string& name, const Item& item, unsigned type) {
    const Utf8Locale names;
    archive_entry_clear(entry_.get());
    archive_entry_copy_pathname(entry_.get(), name.c_str());
    archive_entry_set_filetype(entry_.get(), type);
    archive_entry_set_perm(entry_.get(), item.mode & 0777);
    archive_entry_set_mtime(entry_.get(), item.mtime, 0);
    archive_entry_set_size(entry_.get(), static_cast<la_int64_t>(item.size));
    return archive_write_header(writer_.get(), entry_.get()) == ARCHIVE_OK;
  }

  std::unique_ptr<archive, Free> writer_;
  std::unique_ptr<archive_entry, Free> entry_;
};

}  // namespace
}  // namespace files

extern "C" __attribute__((visibility("default"))) files::ArchiveWriter* QeloFilesMakeArchiveWriter(
    std::string* out) {
  auto writer = std::make_unique<files::ZipWriter>();
  return writer->Open(out) ? writer.release() : nullptr;
}
