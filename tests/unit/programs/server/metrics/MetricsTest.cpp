#include "programs/server/metrics/Metrics.h"

#include <gtest/gtest.h>

#include <string>

#include "programs/server/metrics/Report.h"

namespace QELO {
namespace {

using std::chrono::microseconds;

TEST(Metrics, TimesCountToTheFirstBoundThatHoldsThem) {
  Metrics::Times times;
  times.Add(microseconds(0));
  times.Add(microseconds(300));
  times.Add(microseconds(301));
  times.Add(std::chrono::seconds(300));
  times.Add(std::chrono::seconds(301));
  EXPECT_EQ(times.counts[0], 2U);
  EXPECT_EQ(times.counts[1], 1U);
  EXPECT_EQ(times.counts[Metrics::Times::kBounds.size() - 1], 1U);
  EXPECT_EQ(times.counts.back(), 1U);
  EXPECT_EQ(times.Count(), 5U);
  EXPECT_EQ(times.sum, std::chrono::seconds(601) + microseconds(601));
}

TEST(Metrics, RefusalsCountByReason_ButNotWhatHadAProcess) {
  Metrics metrics;
  metrics.CountRefusal(Service::Refusal::kBusy);
  metrics.CountRefusal(Service::Refusal::kBusy);
  metrics.CountRefusal(Service::Refusal::kSlow);
  metrics.CountRefusal(Service::Refusal::kMalformed);
  metrics.CountRefusal(Service::Refusal::kTooLarge);
  metrics.CountRefusal(Service::Refusal::kTimedOut);
  const Json::Value refused = MetricsReport::Object(metrics)["refused"];
  EXPECT_EQ(refused["busy"], 2U);
  EXPECT_EQ(refused["slow"], 1U);
  EXPECT_EQ(refused["malformed"], 1U);
  EXPECT_EQ(refused["too_large"], 1U);
  EXPECT_EQ(refused["gone"], 0U);
}

TEST(MetricsReport, TextHasBucketsThatAddUp) {
  Metrics metrics;
  metrics.served = 3;
  metrics.serving.Add(microseconds(200));
  metrics.serving.Add(microseconds(800));
  metrics.serving.Add(std::chrono::seconds(1000));
  const std::string text = MetricsReport::Text(metrics);
  for (const char* line :
       {"# TYPE webapi_server_requests_total counter\n",
        "webapi_server_requests_total{result=\"served\"} 3\n",
        "webapi_server_stage_seconds_bucket{stage=\"serving\",le=\"0.0003\"} 1\n",
        "webapi_server_stage_seconds_bucket{stage=\"serving\",le=\"0.001\"} 2\n",
        "webapi_server_stage_seconds_bucket{stage=\"serving\",le=\"300\"} 2\n",
        "webapi_server_stage_seconds_bucket{stage=\"serving\",le=\"+Inf\"} 3\n",
        "webapi_server_stage_seconds_sum{stage=\"serving\"} 1000.001\n",
        "webapi_server_stage_seconds_count{stage=\"serving\"} 3\n"}) {
    EXPECT_NE(text.find(line), std::string::npos) << line << text;
  }
}

TEST(MetricsReport, TellsOfProcessesThatStay) {
  Metrics metrics;
  metrics.fronts.now = 2;
  metrics.workers.started = 7;
  metrics.workers.timeOut = 3;
  metrics.byFronts = 5;
  metrics.forking.Add(microseconds(200));
  const std::string text = MetricsReport::Text(metrics);
  for (const char* line : {"webapi_server_staying{process=\"front\"} 2\n",
                           "webapi_server_started_total{process=\"worker\"} 7\n",
                           "webapi_server_ended_total{process=\"worker\",reason=\"time_out\"} 3\n",
                           "webapi_server_ended_total{process=\"front\",reason=\"crash\"} 0\n",
                           "webapi_server_calls_total{road=\"worker\"} 5\n",
                           "webapi_server_calls_total{road=\"forked\"} 1\n"}) {
    EXPECT_NE(text.find(line), std::string::npos) << line << text;
  }
  const Json::Value object = MetricsReport::Object(metrics);
  EXPECT_EQ(object["staying"]["worker"]["ended"]["time_out"], 3U);
  EXPECT_EQ(object["staying"]["front"]["now"], 2U);
  EXPECT_EQ(object["calls"]["worker"], 5U);
}

TEST(MetricsReport, CountsKeepTheirDigits) {
  Metrics metrics;
  metrics.served = 123456789012;
  EXPECT_NE(MetricsReport::Text(metrics).find("served\"} 123456789012\n"), std::string::npos);
}

}  // namespace
}  // namespace QELO
