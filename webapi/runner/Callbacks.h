#pragma once

namespace QELO {

class APIResponse;

/// Runs a response's callbacks in a background process, a second from now.
/// @return false when there are none, or the process could not be made
bool RunCallbacks(APIResponse& response);

}  // namespace QELO
