#pragma once

#include "platform/base/IpAddress.h"
#include "platform/settings/Settings.h"

namespace QELO::Platform {

/// The address of the client of this CGI process: the web server's REMOTE_ADDR, or what a proxy
/// named by the setting "trusted_proxy" says.
/// @return false when it cannot be told: no address, or a trusted proxy's headers contradict each
///         other
bool findRemoteAddress(const Settings& settings, IpAddress& address);

}  // namespace QELO::Platform
