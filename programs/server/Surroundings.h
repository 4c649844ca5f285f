#pragma once

#include <vector>

namespace QELO {

/// Makes a server's process what one should be, whoever started it: files that it makes are its own
/// alone unless it says otherwise, no standard descriptor is missing, standard input leads nowhere,
/// and the environment holds what a program of the system needs. Descriptors that it was started
/// with are closed, but for those returned: the listening sockets that the service manager hands
/// it.
std::vector<int> PrepareServer();

}  // namespace QELO
