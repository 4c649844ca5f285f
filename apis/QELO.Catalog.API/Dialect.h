#pragma once

#include <json/json.h>

/// A schema of draft 7, without references, as OpenAPI 3.1 has it: in JSON Schema 2020-12.
Json::Value Modern(const Json::Value& schema);
