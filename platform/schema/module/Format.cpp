#include "platform/schema/module/Format.h"

#include <arpa/inet.h>

#include <algorithm>
#include <string>

#include "webapi/base/Hex.h"
#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr size_t kLongestAddress = 320;  ///< bytes of an e-mail address

/// Takes a number of just so many digits off the front of a text.
bool takeDigits(std::string_view& text, size_t count, int least, int most, int* found = nullptr) {
  int number = 0;
  for (size_t i = 0; i < count; ++i) {
    if (i >= text.size() || !IsDigit(text[i])) {
      return false;
    }
    number = number * 10 + (text[i] - '0');
  }
  text.remove_prefix(count);
  if (found != nullptr) {
    *found = number;
  }
  return number >= least && number <= most;
}

bool take(std::string_view& text, std::string_view any) {
  const bool isThere = !text.empty() && any.find(text.front()) != std::string_view::npos;
  text.remove_prefix(isThere ? 1 : 0);
  return isThere;
}

bool takeDate(std::string_view& text) {
  int year = 0;
  int month = 0;
  int day = 0;
  if (!takeDigits(text, 4, 0, 9999, &year) || !take(text, "-") ||
      !takeDigits(text, 2, 1, 12, &month) || !take(text, "-") ||
      !takeDigits(text, 2, 1, 31, &day)) {
    return false;
  }
  const bool isLeap = year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
  const int february = isLeap ? 29 : 28;
  const int most = month == 2                                              ? february
                   : month == 4 || month == 6 || month == 9 || month == 11 ? 30
                                                                           : 31;
  return day <= most;
}

bool takeTime(std::string_view& text) {
  if (!takeDigits(text, 2, 0, 23) || !take(text, ":") || !takeDigits(text, 2, 0, 59) ||
      !take(text, ":") || !takeDigits(text, 2, 0, 60)) {
    return false;
  }
  if (take(text, ".")) {
    if (text.empty() || !IsDigit(text.front())) {
      return false;
    }
    text.remove_prefix(std::min(text.find_first_not_of("0123456789"), text.size()));
  }
  return take(text, "Zz") || (take(text, "+-") && takeDigits(text, 2, 0, 23) && take(text, ":") &&
                              takeDigits(text, 2, 0, 59));
}

bool isDateTime(std::string_view text) {
  return takeDate(text) && take(text, "Tt") && takeTime(text) && text.empty();
}

bool isHostname(std::string_view text) {
  if (text.empty() || text.size() > 253) {
    return false;
  }
  while (true) {
    const size_t end = std::min(text.find('.'), text.size());
    const std::string_view label = text.substr(0, end);
    const bool isGood = !label.empty() && label.size() <= 63 && label.front() != '-' &&
                        label.back() != '-' && std::all_of(label.begin(), label.end(), [](char c) {
                          return IsAlphanumeric(c) || c == '-';
                        });
    if (!isGood || end == text.size()) {
      return isGood;
    }
    text.remove_prefix(end + 1);
  }
}

bool isAddress(int family, std::string_view text) {
  unsigned char address[sizeof(in6_addr)];
  return text.size() < INET6_ADDRSTRLEN && text.find('\0') == std::string_view::npos &&
         inet_pton(family, std::string(text).c_str(), address) == 1;
}

bool isEmail(std::string_view text) {
  const size_t at = text.rfind('@');
  if (at == std::string_view::npos || at == 0 || text.size() > kLongestAddress) {
    return false;
  }
  const std::string_view local = text.substr(0, at);
  return local.front() != '.' && local.back() != '.' &&
         local.find("..") == std::string_view::npos &&
         std::all_of(local.begin(), local.end(),
                     [](char c) {
                       return IsAlphanumeric(c) ||
                              std::string_view("!#$%&'*+-/=?^_`{|}~.").find(c) !=
                                  std::string_view::npos ||
                              static_cast<unsigned char>(c) >= 0x80;
                     }) &&
         isHostname(text.substr(at + 1));
}

bool isUuid(std::string_view text) {
  if (text.size() != 36) {
    return false;
  }
  for (size_t i = 0; i < text.size(); ++i) {
    const bool isDash = i == 8 || i == 13 || i == 18 || i == 23;
    if (isDash ? text[i] != '-' : HexValue(text[i]) < 0) {
      return false;
    }
  }
  return true;
}

}  // namespace

bool isOfFormat(std::string_view format, std::string_view text) {
  if (format == "date") {
    return takeDate(text) && text.empty();
  }
  if (format == "time") {
    return takeTime(text) && text.empty();
  }
  if (format == "date-time") {
    return isDateTime(text);
  }
  if (format == "email") {
    return isEmail(text);
  }
  if (format == "hostname") {
    return isHostname(text);
  }
  if (format == "ipv4") {
    return isAddress(AF_INET, text);
  }
  if (format == "ipv6") {
    return isAddress(AF_INET6, text);
  }
  return format != "uuid" || isUuid(text);
}

}  // namespace QELO::Platform
