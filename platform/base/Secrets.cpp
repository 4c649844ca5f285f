#include "platform/base/Secrets.h"

#include <sys/random.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr size_t kRandomBytes = 32;
constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_";

bool fillRandom(unsigned char* bytes, size_t size) {
  while (size > 0) {
    const ssize_t count = TEMP_FAILURE_RETRY(getrandom(bytes, size, 0));
    if (count <= 0) {
      return false;
    }
    bytes += count;
    size -= static_cast<size_t>(count);
  }
  return true;
}

}  // namespace

std::string makeSecret() {
  unsigned char bytes[kRandomBytes + 1] = {};  // one zero byte to end on a whole group of three
  if (!fillRandom(bytes, kRandomBytes)) {
    return {};
  }
  std::string text;
  for (size_t i = 0; i < kRandomBytes; i += 3) {
    const unsigned group = bytes[i] << 16U | bytes[i + 1] << 8U | bytes[i + 2];
    for (unsigned shift = 24; shift > 0;) {
      shift -= 6;
      text += kAlphabet[group >> shift & 63U];
    }
  }
  text.resize(kSecretLength);
  return text;
}

bool isSecretText(std::string_view text) {
  return text.size() == kSecretLength && std::all_of(text.begin(), text.end(), [](char c) {
           return IsAlphanumeric(c) || c == '-' || c == '_';
         });
}

bool equalSecrets(std::string_view left, std::string_view right) {
  if (left.size() != right.size()) {
    return false;
  }
  volatile unsigned char difference = 0;
  for (size_t i = 0; i < left.size(); ++i) {
    difference = difference | static_cast<unsigned char>(left[i] ^ right[i]);
  }
  return difference == 0;
}

}  // namespace QELO::Platform
