#include "webapi/model/useragent/UserAgent.h"

#include <cstdlib>
#include <cstring>
#include <memory>

#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/platform/Core.h"

namespace QELO {

void APIRequestPrivate::InitUA() {
  if (HasData("userAgent", "initialized")) {
    return;
  }
  SetData("userAgent", "initialized", true, false);
  if (!HasData("environ", "HTTP_USER_AGENT")) {
    return;
  }
  const std::unique_ptr<char, decltype(&free)> header(
      strdup(Text("environ", "HTTP_USER_AGENT").c_str()), free);
  if (header == nullptr) {
    return;
  }
  QLIBCStrCaseLower(header.get());
  const UserAgent agent = UserAgent::Classify(
      header.get(), HasData("environ", "HTTP_UA_OS") || HasData("environ", "HTTP_X_WAP_PROFILE"));
  const bool forceDesktop = strtol(GetCookie("forceDesktop", "0").c_str(), nullptr, 10) != 0;
  SetData("userAgent", "uaMobile", agent.mobileDevice && !forceDesktop, false);
  SetData("userAgent", "uaMobileDevice", agent.mobileDevice, false);
  SetData("userAgent", "uaIPhone", agent.iPhone, false);
  SetData("userAgent", "uaAndroid", agent.android, false);
  SetData("userAgent", "uaIEMobile", agent.ieMobile, false);
  SetData("userAgent", "uaIPad", agent.iPad, false);
  SetData("userAgent", "uaPlayBook", agent.playBook, false);
  SetData("userAgent", "uaBlackBerry6", agent.blackBerry6, false);
  SetData("userAgent", "uaWebKit", agent.webKit, false);
  SetData("userAgent", "uaSupportWebAPP", agent.supportWebApp, false);
}

bool APIRequestPrivate::Device(const char* flag) {
  InitUA();
  return Flag("userAgent", flag, false, false);
}

bool APIRequest::IsMobile() const {
  return private_->Device("uaMobile");
}

bool APIRequest::IsMobileDevice() const {
  return private_->Device("uaMobileDevice");
}

bool APIRequest::IsIPhone() const {
  return private_->Device("uaIPhone");
}

bool APIRequest::IsAndroid() const {
  return private_->Device("uaAndroid");
}

bool APIRequest::IsIEMobile() const {
  return private_->Device("uaIEMobile");
}

bool APIRequest::IsIPad() const {
  return private_->Device("uaIPad");
}

bool APIRequest::IsPlayBook() const {
  return private_->Device("uaPlayBook");
}

bool APIRequest::IsBlackBerry6() const {
  return private_->Device("uaBlackBerry6");
}

bool APIRequest::IsWebKit() const {
  return private_->Device("uaWebKit");
}

bool APIRequest::IsSupportWebApp() const {
  return private_->Device("uaSupportWebAPP");
}

}  // namespace QELO
