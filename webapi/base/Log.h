#pragma once

#include <syslog.h>

#include "webapi/base/LogText.h"

/// One message to syslog at error level: "%s:%d " with the source's name and the line, then the
/// format. What a client may have chosen goes through LogText.
/// @param source  the name that administrators know the component by, as "APIRunner.cpp"; it stays
///                when code moves to another file
#define WEBAPI_LOG(source, format, ...) \
  syslog(LOG_ERR, "%s:%d " format, source, __LINE__ __VA_OPT__(, ) __VA_ARGS__)
