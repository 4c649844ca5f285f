#pragma once

#include <errno.h>

namespace QELO {

/// Requests go by the same name in logs, whoever starts their process.
inline void TakeEntryName() {
  static char name[] = "entry.cgi";
  program_invocation_name = program_invocation_short_name = static_cast<char*>(name);
}

}  // namespace QELO
