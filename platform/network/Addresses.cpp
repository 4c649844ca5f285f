#include <arpa/inet.h>

#include <initializer_list>

#include "webapi/platform/Network.h"

extern "C" int QELONetGetAddrType(const char* text) {
  in6_addr address{};
  for (const int family : {AF_INET, AF_INET6}) {
    if (text != nullptr && inet_pton(family, text, &address) == 1) {
      return family;
    }
  }
  return 0;
}
