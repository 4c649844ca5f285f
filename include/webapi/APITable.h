#pragma once

#include <cstdint>

/// The binary interface between the framework and an API library.
///
/// An API library exports, with plain C names:
///
///     extern "C" QELO::_tag_API_TABLE* GetAPITable();
///     extern "C" QELO::_tag_API_CHECK_TABLE* GetAPICheckTable();   // optional
///
/// Both return static arrays of the library, which the framework neither copies nor frees.
///
/// An exception that leaves one of these functions or a function of their tables is caught. One
/// that leaves the constructor of a static object is not: nothing can be unwound while a library is
/// being loaded, so the process ends without an answer. Make objects that can fail at their first
/// use.
namespace QELO {

class APIRequest;
class APIResponse;

/// One method. The array ends with an entry whose `api` is null.
struct _tag_API_TABLE {
  const char* api;     ///< full API name, as in the request
  int32_t version;     ///< API version that this entry serves
  const char* method;  ///< method name
  /// Serves the call. A method that sets neither success nor an error answers 117; so does one
  /// that lets an exception escape, which is logged.
  void (*function)(APIRequest*, APIResponse*);
};

/// One request check. The array ends with an entry whose `api` and `check` are null.
struct _tag_API_CHECK_TABLE {
  const char* api;
  int32_t version;
  const char* method;
  /// Vets the request before the call; 0 stops it, and the check has set the response's error.
  int (*check)(APIRequest*, APIResponse*);
  void* reserved[2];  ///< the library's own; not read by the framework
};

/// One check of an application's sharing check library, which vets calls that come by links of the
/// application. The library exports, with a plain C name:
///
///     extern "C" QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable();
///
/// It stands in "/usr/lib/sharing/permission_lib/", named after the application with ".so" behind.
/// The first entry that fits a call decides; a call that none fits is refused. The array ends with
/// an entry whose `api` is null.
struct _tag_API_SHARING_CHECK_TABLE {
  const char* api;     ///< POSIX extended regular expression over the API's name; "*": any
  int32_t version;     ///< API version; 0: any
  const char* method;  ///< as `api`, over the method's name
  /// Whether the visitor may make this call. Runs with the credentials of the library file's
  /// owner.
  bool (*check)(APIRequest*, APIResponse*);
};

}  // namespace QELO
