#include "Digest.h"

#include <fcntl.h>
#include <openssl/evp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <vector>

namespace checksum {
namespace {

constexpr size_t kPiece = 256 * 1024;  ///< bytes read at once

struct Free {
  void operator()(EVP_MD_CTX* context) const { EVP_MD_CTX_free(context); }
};

/// A descriptor that is closed at the end.
class Opened {
 public:
  explicit Opened(int fd) : fd_(fd) {}
  Opened(const Opened&) = delete;
  Opened& operator=(const Opened&) = delete;
  ~Opened() {
    if (fd_ >= 0) {
      close(fd_);
    }
  }
  int Get() const { return fd_; }

 private:
  int fd_;
};

std::string hexOf(const unsigned char* bytes, unsigned size) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string text;
  for (unsigned i = 0; i < size; ++i) {
    text += kDigits[bytes[i] >> 4];
    text += kDigits[bytes[i] & 15];
  }
  return text;
}

}  // namespace

int digestOf(const std::string& path, const std::function<void(uint64_t)>& progress,
             std::string& digest) {
  // What was a file may be a pipe by now: opening that must not wait for a writer.
  const Opened file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  struct stat info {};
  if (file.Get() < 0 || fstat(file.Get(), &info) != 0) {
    return errno;
  }
  if (!S_ISREG(info.st_mode)) {
    return EINVAL;
  }
  posix_fadvise(file.Get(), 0, 0, POSIX_FADV_SEQUENTIAL);
  const std::unique_ptr<EVP_MD_CTX, Free> context(EVP_MD_CTX_new());
  if (context == nullptr || EVP_DigestInit_ex(context.get(), EVP_sha256(), nullptr) != 1) {
    return ENOMEM;
  }
  std::vector<unsigned char> piece(kPiece);
  ssize_t count = 0;
  while ((count = TEMP_FAILURE_RETRY(read(file.Get(), piece.data(), piece.size()))) > 0) {
    EVP_DigestUpdate(context.get(), piece.data(), static_cast<size_t>(count));
    progress(static_cast<uint64_t>(count));
  }
  if (count < 0) {
    return errno;
  }
  unsigned char bytes[EVP_MAX_MD_SIZE];
  unsigned size = 0;
  EVP_DigestFinal_ex(context.get(), bytes, &size);
  digest = hexOf(bytes, size);
  return 0;
}

}  // namespace checksum
