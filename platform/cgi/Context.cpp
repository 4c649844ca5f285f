#include "platform/cgi/Context.h"

#include <algorithm>
#include <cstdlib>
#include <string>
#include <string_view>

#include "platform/settings/Settings.h"
#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr char kLanguages[][4] = {"enu", "cht", "chs", "krn", "ger", "fre", "ita",
                                  "spn", "jpn", "dan", "nor", "sve", "nld", "rus",
                                  "plk", "ptb", "ptg", "hun", "trk", "csy", "tha"};
/// The user store that login sessions belong to, and the default.
constexpr char kSessionStoreName[] = "current.users";

/// @return the number in the table, counted from 1, or 0
unsigned char languageNumber(std::string_view code) {
  const auto* found = std::find(std::begin(kLanguages), std::end(kLanguages), code);
  return found == std::end(kLanguages)
             ? 0
             : static_cast<unsigned char>(found - std::begin(kLanguages) + 1);
}

void takeId(std::string_view id, ContextArea& area) {
  memset(area.id, 0, sizeof area.id);
  area.state = ContextArea::kNoId;
  if (isSecretText(id)) {
    id.copy(area.id, id.size());
    area.state = ContextArea::kHasId;
  } else if (!id.empty()) {
    area.state = ContextArea::kMalformedId;
  }
}

ContextArea readCookies(std::string_view line) {
  ContextArea area{};
  while (!line.empty()) {
    const std::string_view cookie = Trim(TakePiece(line, ";"));
    const size_t equals = cookie.find('=');
    if (equals == std::string_view::npos) {
      continue;
    }
    const std::string_view name = cookie.substr(0, equals);
    const std::string_view value = cookie.substr(equals + 1);
    if (name == "id") {
      takeId(value, area);
    } else if (name == "lang") {
      area.language = languageNumber(value);
    }
  }
  return area;
}

/// An access token that came as a header, which web servers do not log as they do addresses: from
/// here on it is where the token of a parameter is too, and the header is gone.
void takeTokenHeader() {
  constexpr char kHeader[] = "HTTP_X_QELO_ACCESS_TOKEN";
  const char* token = getenv(kHeader);
  if (token != nullptr && setenv("qeloAccessToken", token, 1) == 0) {
    unsetenv(kHeader);
  }
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" {

int QeloCgiInit(const char*, QeloCgiContext* context) {
  if (context == nullptr) {
    return 0;
  }
  storeArea(ContextArea{}, *context);
  takeTokenHeader();
  return 1;
}

int QeloCgiInitEx(const char* userStore, QeloCgiContext* context) {
  if (userStore == nullptr || (*userStore != '\0' && strcmp(userStore, kSessionStoreName) != 0)) {
    return 0;
  }
  return QeloCgiLoadInCookies(context);
}

int QeloCgiLoadInCookies(QeloCgiContext* context) {
  if (context == nullptr) {
    return 0;
  }
  const char* cookies = getenv("HTTP_COOKIE");
  storeArea(readCookies(cookies != nullptr ? cookies : ""), *context);
  return 1;
}

const char* QeloCgiGetLang(QeloCgiContext* context) {
  unsigned char number = context != nullptr ? loadArea(*context).language : 0;
  if (number == 0 || number > std::size(kLanguages)) {
    number = languageNumber(Settings().Get("language", ""));
  }
  return kLanguages[number == 0 ? 0 : number - 1];
}

int QeloCgiKeepsVariable(const char* name) {
  const std::string names = Settings().Get("keep_environment", "");
  for (std::string_view rest = names; !rest.empty();) {
    const size_t end = rest.find_first_of(", \t");
    if (rest.substr(0, end) == name) {
      return 1;
    }
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
  }
  return 0;
}

int QeloCgiIsTokenEnable(QeloCgiContext*) {
  return Settings().TokenEnabled() ? 1 : 0;
}

}  // extern "C"
