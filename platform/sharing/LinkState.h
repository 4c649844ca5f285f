#pragma once

#include <cstdint>

#include "platform/sharing/LinkStore.h"

namespace QELO::Platform {

/// Seconds that a visitor's session lasts when it is not used.
int sharingTimeout();

/// Whether a link may be used now: it has not expired, and its owner is still the user who made it
/// and may use what a login has given.
bool isUsable(const StoredLink& link, int64_t now);

}  // namespace QELO::Platform
