#pragma once

#include "webapi/APIRunner.h"
#include "webapi/runner/catalogue/Catalogue.h"
#include "webapi/runner/library/LibraryCache.h"
#include "webapi/runner/road/CallRoad.h"

namespace QELO {

/// What works on the runner's members.
struct APIRunner::Rooms {
  Catalogue catalogue;
  LibraryCache libraries;
  CallRoad* road = nullptr;
};

}  // namespace QELO
