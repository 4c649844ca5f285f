#pragma once

#include <sys/resource.h>

#include "webapi/base/UniqueFd.h"

namespace QELO {

/// Lets the process have so many descriptors, as far as the system allows it.
void RaiseFileLimit(rlim_t needed);

/// Leaves a forked child this one descriptor beside the standard ones.
/// @param descriptor  receives the number that it has from then on
void KeepAlone(UniqueFd& descriptor);

}  // namespace QELO
