#include "webapi/platform/Core.h"

extern "C" void QLIBCStrCaseLower(char* text) {
  // Not tolower(), which goes by the locale that a method may have set.
  for (; *text != '\0'; ++text) {
    if (*text >= 'A' && *text <= 'Z') {
      *text = static_cast<char>(*text - 'A' + 'a');
    }
  }
}
