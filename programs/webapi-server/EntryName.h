#pragma once

#include <errno.h>

namespace QELO {

/// Requests go by the same name in logs, whoever starts their process.
inline void TakeEntryName(bool isRest = false) {
  static char name[] = "entry.cgi";
  static char rest[] = "rest.cgi";
  program_invocation_name = program_invocation_short_name =
      isRest ? static_cast<char*>(rest) : static_cast<char*>(name);
}

}  // namespace QELO
