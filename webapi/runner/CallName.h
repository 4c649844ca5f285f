#pragma once

#include <string>

#include "webapi/APIRequest.h"

namespace QELO {

/// What a request calls, read once: each part costs two look-ups in its record.
struct CallName {
  explicit CallName(const APIRequest& request)
      : api(request.GetAPIClass()),
        version(request.GetAPIVersion()),
        method(request.GetAPIMethod()) {}

  std::string api;
  int version;
  std::string method;
};

}  // namespace QELO
