#include "programs/server/metrics/Report.h"

#include <cstdio>
#include <utility>
#include <vector>

namespace QELO::MetricsReport {
namespace {

constexpr char kPrefix[] = "webapi_server_";

double seconds(std::chrono::microseconds time) {
  return std::chrono::duration<double>(time).count();
}

std::string number(double value) {
  char text[32];
  snprintf(text, sizeof text, "%.12g", value);
  return text;
}

/// One metric's lines.
class Lines {
 public:
  Lines(std::string& text, const char* name, const char* type, const char* help)
      : text_(text), name_(std::string(kPrefix) + name) {
    text_ += "# HELP " + name_ + " " + help + "\n# TYPE " + name_ + " " + type + "\n";
  }

  Lines& Add(double value, const std::string& labels = "", const char* ending = "") {
    text_ +=
        name_ + ending + (labels.empty() ? "" : "{" + labels + "}") + " " + number(value) + "\n";
    return *this;
  }

 private:
  std::string& text_;
  const std::string name_;
};

std::string label(const char* name, const std::string& value) {
  return std::string(name) + "=\"" + value + "\"";
}

using Named = std::vector<std::pair<const char*, uint64_t>>;

Named results(const Metrics& metrics) {
  return {{"served", metrics.served}, {"crashed", metrics.crashed}, {"killed", metrics.killed}};
}

Named refusals(const Metrics& metrics) {
  return {{"busy", metrics.busy},          {"slow", metrics.slow}, {"malformed", metrics.malformed},
          {"too_large", metrics.tooLarge}, {"gone", metrics.gone}, {"denied", metrics.denied}};
}

std::vector<std::pair<const char*, const Metrics::Times*>> stages(const Metrics& metrics) {
  return {{"arriving", &metrics.arriving},
          {"waiting", &metrics.waiting},
          {"forking", &metrics.forking},
          {"serving", &metrics.serving}};
}

std::vector<std::pair<const char*, const Metrics::Staying*>> staying(const Metrics& metrics) {
  return {{"front", &metrics.fronts}, {"worker", &metrics.workers}};
}

Named endings(const Metrics::Staying& kind) {
  return {{"idle", kind.idle},   {"calls", kind.calls},      {"memory", kind.memory},
          {"crash", kind.crash}, {"time_out", kind.timeOut}, {"remains", kind.remains},
          {"other", kind.other}};
}

Named roads(const Metrics& metrics) {
  return {{"worker", metrics.byFronts}, {"forked", metrics.forking.Count()}};
}

void addStages(const Metrics& metrics, std::string& text) {
  Lines lines(text, "stage_seconds", "histogram", "How long requests are in each stage.");
  for (const auto& [name, times] : stages(metrics)) {
    const std::string stage = label("stage", name);
    uint64_t count = 0;
    for (size_t i = 0; i < times->counts.size(); ++i) {
      count += times->counts[i];
      const std::string bound =
          i < Metrics::Times::kBounds.size() ? number(Metrics::Times::kBounds[i]) : "+Inf";
      lines.Add(static_cast<double>(count), stage + "," + label("le", bound), "_bucket");
    }
    lines.Add(seconds(times->sum), stage, "_sum").Add(static_cast<double>(count), stage, "_count");
  }
}

void addNamed(const Named& figures, const char* kind, Lines lines) {
  for (const auto& [name, count] : figures) {
    lines.Add(static_cast<double>(count), label(kind, name));
  }
}

void addStaying(const Metrics& metrics, std::string& text) {
  Lines now(text, "staying", "gauge", "Processes that stay from request to request.");
  for (const auto& [name, kind] : staying(metrics)) {
    now.Add(static_cast<double>(kind->now), label("process", name));
  }
  Lines started(text, "started_total", "counter", "Those that were started.");
  for (const auto& [name, kind] : staying(metrics)) {
    started.Add(static_cast<double>(kind->started), label("process", name));
  }
  Lines ended(text, "ended_total", "counter", "Those that have ended.");
  for (const auto& [name, kind] : staying(metrics)) {
    for (const auto& [reason, count] : endings(*kind)) {
      ended.Add(static_cast<double>(count), label("process", name) + "," + label("reason", reason));
    }
  }
}

Json::Value objectOf(const Named& figures) {
  Json::Value object(Json::objectValue);
  for (const auto& [name, count] : figures) {
    object[name] = static_cast<Json::UInt64>(count);
  }
  return object;
}

}  // namespace

std::string Text(const Metrics& metrics) {
  std::string text;
  addNamed(results(metrics), "result",
           {text, "requests_total", "counter", "Requests whose process has ended."});
  addNamed(refusals(metrics), "reason",
           {text, "refused_total", "counter", "Requests that got no process."});
  Lines(text, "running", "gauge", "Requests that have a process.")
      .Add(static_cast<double>(metrics.runningNow));
  Lines(text, "waiting", "gauge", "Requests that wait for their turn.")
      .Add(static_cast<double>(metrics.waitingNow));
  Lines(text, "arriving", "gauge", "Requests whose header is on its way.")
      .Add(static_cast<double>(metrics.arrivingNow));
  Lines(text, "limit", "gauge", "Most of them.")
      .Add(metrics.limits.atOnce, label("of", "running"))
      .Add(metrics.limits.queued, label("of", "waiting"))
      .Add(metrics.limits.arriving, label("of", "arriving"));
  addStages(metrics, text);
  addNamed(roads(metrics), "road",
           {text, "calls_total", "counter", "Requests by the road that they have taken."});
  addStaying(metrics, text);
  Lines(text, "processor_seconds_total", "counter", "Processor time of processes that have ended.")
      .Add(seconds(metrics.processor));
  Lines(text, "start_time_seconds", "gauge", "When the server was started, seconds since 1970.")
      .Add(static_cast<double>(metrics.startedAt));
  return text;
}

Json::Value Object(const Metrics& metrics) {
  Json::Value object(Json::objectValue);
  object["started"] = static_cast<Json::Int64>(metrics.startedAt);
  object["requests"] = objectOf(results(metrics));
  object["refused"] = objectOf(refusals(metrics));
  object["now"] = objectOf({{"running", metrics.runningNow},
                            {"waiting", metrics.waitingNow},
                            {"arriving", metrics.arrivingNow}});
  object["limits"] = objectOf({{"running", metrics.limits.atOnce},
                               {"waiting", metrics.limits.queued},
                               {"arriving", metrics.limits.arriving}});
  for (const auto& [name, times] : stages(metrics)) {
    object["stages"][name]["count"] = static_cast<Json::UInt64>(times->Count());
    object["stages"][name]["seconds"] = seconds(times->sum);
  }
  object["calls"] = objectOf(roads(metrics));
  for (const auto& [name, kind] : staying(metrics)) {
    object["staying"][name]["now"] = static_cast<Json::UInt64>(kind->now);
    object["staying"][name]["started"] = static_cast<Json::UInt64>(kind->started);
    object["staying"][name]["ended"] = objectOf(endings(*kind));
  }
  object["processorSeconds"] = seconds(metrics.processor);
  return object;
}

}  // namespace QELO::MetricsReport
