#include "webapi/model/useragent/UserAgent.h"

#include <regex.h>

#include <string_view>

namespace QELO {
namespace {

constexpr char kOtherMobile[] =
    "(SymbianOS|Windows CE|PalmOS|BlackBerry|Vodafone|Opera Mobi|Opera "
    "Mini|UP\\.Browser|AvantGo|EudoraWeb|PLink|Plucker|NetFront|Xiino|Blazer|WebPro|ProxiNet|"
    "Elaine)";

bool names(std::string_view header, std::string_view word) {
  return header.find(word) != std::string_view::npos;
}

bool namesOtherMobile(const char* header) {
  regex_t pattern{};
  if (regcomp(&pattern, kOtherMobile, REG_EXTENDED | REG_ICASE | REG_NOSUB) != 0) {
    return false;
  }
  const bool found = regexec(&pattern, header, 0, nullptr, 0) == 0;
  regfree(&pattern);
  return found;
}

/// Sets the flags of the first brand that the header names. @return false when it names none
bool takeBrand(std::string_view header, UserAgent& agent) {
  if (names(header, "ipad")) {
    agent.iPad = agent.iPhone = true;
  } else if (names(header, "iphone") || names(header, "ipod")) {
    agent.iPhone = true;
  } else if (names(header, "android")) {
    agent.android = true;
  } else if (names(header, "playbook")) {
    agent.playBook = true;
  } else if (agent.webKit && names(header, "blackberry")) {
    agent.blackBerry6 = true;
  } else {
    return false;
  }
  agent.supportWebApp = agent.webKit;
  return true;
}

}  // namespace

UserAgent UserAgent::Classify(const char* header, bool profiled) {
  UserAgent agent;
  agent.webKit = names(header, "webkit");
  agent.mobileDevice = takeBrand(header, agent) || namesOtherMobile(header) || profiled;
  agent.ieMobile = agent.mobileDevice && (names(header, "msie") || names(header, "iemobile"));
  return agent;
}

}  // namespace QELO
