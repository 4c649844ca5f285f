#pragma once

#include <string>
#include <vector>

namespace QELO::ServiceManager {

/// Tells the service manager what the server does, where there is one that wants to know: the
/// socket named by NOTIFY_SOCKET. @param state  lines as "READY=1"
void Tell(const std::string& state);

/// Tells that the settings are read anew; READY=1 ends that.
void TellReloading();

/// The listening sockets that the service manager has opened for this process, and for no other;
/// they are asked for once.
std::vector<int> TakeSockets();

}  // namespace QELO::ServiceManager
