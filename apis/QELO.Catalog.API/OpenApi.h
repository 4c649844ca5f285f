#pragma once

#include <json/json.h>

/// An OpenAPI 3.1 document of APIs: one path a method, as the REST entry serves them. That entry
/// takes JSON alone, so methods that take an upload have no path; "info" says where they are.
/// @param apis  as the method "describe" answers them, each
Json::Value OpenApi(const Json::Value& apis);
