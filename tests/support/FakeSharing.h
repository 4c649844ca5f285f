#pragma once

#include <json/json.h>

#include "webapi/platform/Sharing.h"

/// What the fake platform does with the links of users; each call is recorded there.
struct FakeSharing {
  static FakeSharing& Get();

  QELO::sharing::LinkResult result = QELO::sharing::LINK_DONE;
  Json::Value answer;  ///< what each receives
};
