#pragma once

namespace QELO {

/// The numbers in "error"/"code" of an answer. Numbers from 400 on are free for API libraries;
/// polling tasks use 500 to 508.
enum _tag_WEBAPI_ERR : int {
  WEBAPI_ERR_NONE = 0,
  WEBAPI_ERR_BAD_REQUEST = 101,          ///< bad or missing input
  WEBAPI_ERR_NO_SUCH_API = 102,          ///< the API has no loaded description
  WEBAPI_ERR_NO_SUCH_METHOD = 103,       ///< the method is not listed for the version
  WEBAPI_ERR_NO_SUCH_VERSION = 104,      ///< the version is out of range
  WEBAPI_ERR_NO_PERMISSION = 105,        ///< refused, or the user class is not allowed
  WEBAPI_ERR_SESSION_TIMEOUT = 106,      ///< the login session timed out
  WEBAPI_ERR_SESSION_INTERRUPTED = 107,  ///< the session check found a broken session
  WEBAPI_ERR_UPLOAD_FAILED = 108,        ///< upload intake failed; data {"upload_err": n}
  WEBAPI_ERR_RELAY_FAILED = 109,         ///< relaying failed, or was asked for where it cannot be
  WEBAPI_ERR_NO_COMPOUND = 110,          ///< no usable "compound" array; a polling fork failed
  WEBAPI_ERR_NO_LIBRARY = 111,           ///< the API library or its table could not be loaded
  WEBAPI_ERR_COMPOUND_STOPPED = 112,     ///< entry skipped after an earlier failure
  WEBAPI_ERR_COMPOUND_TRANSFER = 113,    ///< entry whose method uploads or downloads
  WEBAPI_ERR_POLLING_GROUP = 114,        ///< unknown "share_to_group"
  WEBAPI_ERR_UPLOAD_REFUSED = 115,       ///< upload to a method without "allowUpload"
  WEBAPI_ERR_DEMO_REFUSED = 116,         ///< demo mode and a method without "allowDemo"
  WEBAPI_ERR_NO_ANSWER = 117,            ///< preset: the method set nothing or could not be run
  WEBAPI_ERR_PROCESS_NAME = 118,         ///< the process could not be named for the call
  WEBAPI_ERR_NOT_AUTHENTICATED = 119,    ///< no valid session or token
  WEBAPI_ERR_METHOD_MISSING = 121,       ///< the method is missing from the library's table
  WEBAPI_ERR_SHARING_NO_SESSION = 122,   ///< not signed in to the sharing link
  WEBAPI_ERR_SHARING_MISMATCH = 123,     ///< signed in, but to another sharing link
  WEBAPI_ERR_SHARING_DENIED = 124,       ///< the sharing link has expired, or refuses the call
  WEBAPI_ERR_SHARING_TIMEOUT = 125,      ///< the sharing link's session timed out
  WEBAPI_ERR_SHARING_REFUSED = 126,      ///< no such sharing link, or the method takes none
  WEBAPI_ERR_SHARING_APPLICATION = 127,  ///< the sharing link's application refuses the call
  WEBAPI_ERR_ADDRESS_MISMATCH = 150,     ///< another address than the session's
  WEBAPI_ERR_NO_APP_PRIVILEGE = 160,     ///< the application privilege is missing
};

}  // namespace QELO
