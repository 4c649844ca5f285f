#pragma once

#include <syslog.h>

/// One message to syslog at error level: the source's name and the line, then the format.
#define PLATFORM_LOG(source, format, ...) \
  syslog(LOG_ERR, "%s:%d " format, source, __LINE__ __VA_OPT__(, ) __VA_ARGS__)
