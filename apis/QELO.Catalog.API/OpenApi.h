#pragma once

#include <json/json.h>

/// An OpenAPI 3.1 document of APIs: one path a method, as the REST entry serves them. Methods that
/// take an upload are left out, since that entry takes JSON alone.
/// @param apis  as the method "describe" answers them, each
Json::Value OpenApi(const Json::Value& apis);
