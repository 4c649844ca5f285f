#pragma once

#include <cstddef>
#include <string>

#include "programs/server/Service.h"
#include "programs/server/metrics/Metrics.h"

namespace QELO::MetricsPage {

/// Longest request in bytes.
inline constexpr size_t kLongest = 4096;

/// Takes what has come of an HTTP request without a body; whatever it asks for is read to its end.
/// @return kAnswered when it is whole: `connection.answer` is what to say then. "/metrics" gives
/// the
///         figures as text, "/status" as a JSON object.
Service::Arrival Take(Connection& connection, const Metrics& metrics);

}  // namespace QELO::MetricsPage
