#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

/// What a plugin exports is plain C and visible.
#define PLUGIN_EXPORT extern "C" __attribute__((visibility("default")))
