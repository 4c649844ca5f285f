#include "tests/support/FakePlatform.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Network.h"

namespace {

void note(const char* name, const char* text) {
  FakePlatform::Get().calls.push_back(std::string(name) + "(" + text + ")");
}

}  // namespace

extern "C" {

// Real, since what is made of the text is what tests look at.
void QLIBCStrCaseLower(char* text) {
  note("QLIBCStrCaseLower", text);
  for (; *text != '\0'; ++text) {
    *text = static_cast<char>(*text >= 'A' && *text <= 'Z' ? *text + ('a' - 'A') : *text);
  }
}

int BlQLIBIsHostname(const char* text) {
  note("BlQLIBIsHostname", text);
  return FakePlatform::Get().hostname;
}

int BlQLIBIsDomain(const char* text) {
  note("BlQLIBIsDomain", text);
  return FakePlatform::Get().domain;
}

int QELONetGetAddrType(const char* text) {
  note("QELONetGetAddrType", text);
  return FakePlatform::Get().addressType;
}

}  // extern "C"
