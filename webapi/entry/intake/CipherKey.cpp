#include "webapi/CipherKey.h"

#include "webapi/platform/Cgi.h"

namespace QELO {
namespace {

constexpr int kLongestKey = 4096;  // bytes with the NUL

}  // namespace

bool CipherKey::GetPublic(std::string& pem) {
  char text[kLongestKey];
  if (QeloCgiGetPublicKey(text, kLongestKey) != 0) {
    return false;
  }
  pem = text;
  return true;
}

}  // namespace QELO
