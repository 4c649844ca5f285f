#include "platform/tasks/Id.h"

#include <algorithm>

#include "platform/base/Secrets.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr uid_t kNobody = static_cast<uid_t>(-1);  // to the kernel: no user at all

// Objects, so that the compiler puts them into the loops: a list checks thousands of ids.
constexpr auto isPrefixCharacter = [](char c) {
  return IsAlphanumeric(c) || c == '.' || c == '_' || c == '-';
};
constexpr auto isSecretCharacter = [](char c) { return c != '.' && isPrefixCharacter(c); };

}  // namespace

bool isTaskPrefix(std::string_view prefix) {
  return prefix.size() <= kTaskPrefixLength &&
         std::all_of(prefix.begin(), prefix.end(), isPrefixCharacter);
}

std::string makeTaskId(std::string_view prefix, uid_t store) {
  const std::string secret = makeSecret();
  return secret.empty() ? "" : std::string(prefix) + secret + "." + std::to_string(store);
}

bool readTaskId(std::string_view id, uid_t& store) {
  const size_t dot = id.rfind('.');
  if (dot == std::string_view::npos || dot < kSecretLength) {
    return false;
  }
  const std::string_view secret = id.substr(dot - kSecretLength, kSecretLength);
  return isTaskPrefix(id.substr(0, dot - kSecretLength)) &&
         std::all_of(secret.begin(), secret.end(), isSecretCharacter) &&
         readStoreName(id.substr(dot + 1), store);
}

bool readStoreName(std::string_view name, uid_t& store) {
  uid_t value = 0;
  if (!ParseNumber(name, value) || value == kNobody || name != std::to_string(value)) {
    return false;
  }
  store = value;
  return true;
}

}  // namespace QELO::Platform
