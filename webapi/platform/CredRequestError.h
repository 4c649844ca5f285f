#pragma once

namespace QELO {

/// Why a manager failed, for GetError() and the log.
enum CredRequestError : int {
  CRED_REQUEST_OK = 0,
  CRED_REQUEST_NO_HOST = 1,         ///< no such host, or its settings are of no use
  CRED_REQUEST_FORBIDDEN = 2,       ///< the caller may not use that host
  CRED_REQUEST_LOOP = 3,            ///< the call was relayed to here already
  CRED_REQUEST_TOO_LARGE = 4,       ///< more calls, or a longer one, than a manager takes
  CRED_REQUEST_NO_TRANSPORT = 5,    ///< what sends requests cannot be loaded or started
  CRED_REQUEST_UNREACHABLE = 6,     ///< no such name, or nobody answers there
  CRED_REQUEST_UNTRUSTED = 7,       ///< the host did not show that it is the one that is meant
  CRED_REQUEST_TIMEOUT = 8,         ///< it took too long
  CRED_REQUEST_BROKEN = 9,          ///< the connection ended before the answer did
  CRED_REQUEST_BAD_BODY = 10,       ///< the upload ended or stalled early, or has no good length
  CRED_REQUEST_ANSWER_LENGTH = 11,  ///< the answer is longer than a manager keeps
  CRED_REQUEST_REFUSED = 12         ///< the other web server answered with an error of its own
};

}  // namespace QELO
