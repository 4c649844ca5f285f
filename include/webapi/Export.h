#pragma once

/// Marks what `libwebapi-ARDO5` exports; everything else is hidden.
#define WEBAPI_API __attribute__((visibility("default")))
