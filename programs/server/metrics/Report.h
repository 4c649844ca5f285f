#pragma once

#include <json/json.h>

#include <string>

#include "programs/server/metrics/Metrics.h"

namespace QELO::MetricsReport {

/// As Prometheus reads it: "webapi_server_..." lines with their meanings, times in seconds.
std::string Text(const Metrics& metrics);

/// As an object for programs; docs/server.md tells its members.
Json::Value Object(const Metrics& metrics);

}  // namespace QELO::MetricsReport
