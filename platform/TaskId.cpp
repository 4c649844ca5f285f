#include "platform/TaskId.h"

#include <charconv>

#include "platform/Secrets.h"

namespace QELO::Platform {
namespace {

constexpr char kPrefixAlphabet[] =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789._-";
constexpr uid_t kNobody = static_cast<uid_t>(-1);  // to the kernel: no user at all

}  // namespace

bool isTaskPrefix(std::string_view prefix) {
  return prefix.size() <= kTaskPrefixLength &&
         prefix.find_first_not_of(kPrefixAlphabet) == std::string_view::npos;
}

std::string makeTaskId(std::string_view prefix, uid_t store) {
  const std::string secret = makeSecret();
  return secret.empty() ? "" : std::string(prefix) + secret + "." + std::to_string(store);
}

bool readTaskId(std::string_view id, uid_t& store) {
  const size_t dot = id.rfind('.');
  if (dot == std::string_view::npos || dot < kSecretLength ||
      dot - kSecretLength > kTaskPrefixLength) {
    return false;
  }
  return isTaskPrefix(id.substr(0, dot - kSecretLength)) &&
         isSecretText(id.substr(dot - kSecretLength, kSecretLength)) &&
         readStoreName(id.substr(dot + 1), store);
}

bool readStoreName(std::string_view name, uid_t& store) {
  uid_t value = 0;
  const char* end = name.data() + name.size();
  const auto result = std::from_chars(name.data(), end, value);
  if (result.ec != std::errc() || result.ptr != end || value == kNobody ||
      name != std::to_string(value)) {
    return false;
  }
  store = value;
  return true;
}

}  // namespace QELO::Platform
