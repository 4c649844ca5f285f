#pragma once

namespace QELO {

class APIRequest;
class APIResponse;

/// Gives a response that has an error, and no status of its own, the HTTP status that fits the
/// error: 4xx where the client can do something about it, 422 for an API's own errors, 5xx else.
void SetErrorStatus(const APIRequest& request, APIResponse& response);

}  // namespace QELO
