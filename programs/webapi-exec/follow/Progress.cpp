#include "programs/webapi-exec/follow/Progress.h"

#include <algorithm>
#include <cstdio>

#include "programs/webapi-exec/Text.h"
#include "webapi/JsonHelper.h"

namespace QELO::ExecProgram {
namespace {

using JsonHelper::member;
using Count = Progress::Count;

constexpr char kBytes[] = "bytes";
constexpr char kFiles[] = "files";
constexpr int kWhole = 100;
constexpr size_t kShortestBar = 5;
constexpr size_t kUsualBar = 10;
constexpr size_t kLongestBar = 30;
constexpr size_t kBarShare = 5;  ///< a bar takes one column of so many
constexpr size_t kNarrow = 24;   ///< columns in which the bar has the line for itself
constexpr size_t kLongestName = 16;
constexpr size_t kShortestCurrent = 12;
constexpr char kTurns[] = {'|', '/', '-', '\\'};

int rankOf(const std::string& name) {
  return name == kBytes ? 0 : name == kFiles ? 1 : 2;
}

std::vector<Count> countsOf(const Json::Value& data) {
  std::vector<Count> counts;
  if (!data.isObject()) {
    return counts;
  }
  for (const std::string& name : data.getMemberNames()) {
    const Json::Value& done = member(data[name], "done");
    const Json::Value& total = member(data[name], "total");
    if (done.isNumeric() && total.isNumeric() && JsonHelper::asUInt64(total) > 0) {
      counts.push_back({name, JsonHelper::asUInt64(done), JsonHelper::asUInt64(total)});
    }
  }
  std::stable_sort(counts.begin(), counts.end(), [](const Count& one, const Count& other) {
    return rankOf(one.name) < rankOf(other.name);
  });
  return counts;
}

/// Rounded down: 100 is the whole.
int percentOf(double part) {
  return static_cast<int>(std::clamp(part, 0.0, static_cast<double>(kWhole)));
}

/// 512 of 1536 as "0.5/1.5 KiB".
std::string bytesText(const Count& count) {
  constexpr const char* kUnits[] = {"B", "KiB", "MiB", "GiB", "TiB", "PiB", "EiB"};
  constexpr double kStep = 1024;
  auto done = static_cast<double>(count.done);
  auto total = static_cast<double>(count.total);
  size_t unit = 0;
  for (; total >= kStep && unit + 1 < std::size(kUnits); ++unit) {
    done /= kStep;
    total /= kStep;
  }
  char text[64];
  snprintf(text, sizeof text, unit == 0 ? "%.0f/%.0f %s" : "%.1f/%.1f %s", done, total,
           kUnits[unit]);
  return text;
}

std::string countText(const Count& count) {
  if (count.name == kBytes) {
    return bytesText(count);
  }
  return std::to_string(count.done) + "/" + std::to_string(count.total) + " " +
         frontOf(harmless(count.name), kLongestName);
}

/// 3725 as "1:02:05".
std::string clockText(int64_t seconds) {
  constexpr int64_t kMinute = 60;
  constexpr int64_t kHour = 3600;
  char text[64];
  if (seconds < kHour) {
    snprintf(text, sizeof text, "%d:%02d", static_cast<int>(seconds / kMinute),
             static_cast<int>(seconds % kMinute));
  } else {
    snprintf(text, sizeof text, "%lld:%02d:%02d", static_cast<long long>(seconds / kHour),
             static_cast<int>(seconds % kHour / kMinute), static_cast<int>(seconds % kMinute));
  }
  return text;
}

std::string barText(int percent, size_t length) {
  const size_t full = length * static_cast<size_t>(percent) / kWhole;
  return "[" + std::string(full, '#') + std::string(length - full, '.') + "]";
}

/// The percentage and the bar, or the sign of life.
std::string headText(const Progress& progress, unsigned turn, size_t columns) {
  if (progress.percent < 0) {
    return std::string(1, kTurns[turn % std::size(kTurns)]);
  }
  char percent[8];
  snprintf(percent, sizeof percent, "%3d%%", std::clamp(progress.percent, 0, kWhole));
  const std::string text = percent;
  const size_t around = text.size() + 3;  // a blank and the brackets
  const size_t room = columns > around ? columns - around : 0;
  const size_t length =
      columns < kNarrow ? room : std::clamp(columns / kBarShare, kUsualBar, kLongestBar);
  return length < kShortestBar ? text : text + " " + barText(progress.percent, length);
}

}  // namespace

Progress readProgress(const Json::Value& body) {
  const Json::Value& data = member(body, "data");
  Progress progress;
  progress.counts = countsOf(data);
  const Json::Value& percent = member(data, "progress");
  if (!progress.counts.empty()) {
    const Count& first = progress.counts.front();
    progress.percent =
        first.done < first.total
            ? std::min(kWhole - 1, percentOf(100.0 * static_cast<double>(first.done) /
                                             static_cast<double>(first.total)))
            : kWhole;
  } else if (percent.isNumeric()) {
    progress.percent = percentOf(percent.asDouble());
  }
  progress.state = JsonHelper::asString(member(data, "state"));
  progress.current = JsonHelper::asString(member(data, "current"));
  const Json::Value& left = member(data, "seconds_left");
  if (left.isNumeric()) {
    progress.secondsLeft = std::max<int64_t>(-1, JsonHelper::asInt64(left, -1));
  }
  return progress;
}

std::string progressLine(const Progress& progress, int64_t elapsed, unsigned turn, size_t columns) {
  std::string line = headText(progress, turn, columns);
  size_t used = line.size();
  const auto add = [&](const std::string& text, size_t reserved = 0) {
    const size_t size = columnsOf(text);
    if (size > 0 && used + 2 + size + reserved <= columns) {
      line += "  " + text;
      used += size + 2;
    }
  };
  add(progress.secondsLeft >= 0 && progress.percent < kWhole
          ? clockText(progress.secondsLeft) + " left"
          : clockText(elapsed));
  for (const Count& count : progress.counts) {
    add(countText(count));
  }
  add(frontOf(harmless(progress.state), kLongestName),
      progress.current.empty() ? 0 : 2 + kShortestCurrent);
  if (used + 2 + kShortestCurrent <= columns) {
    add(backOf(harmless(progress.current), columns - used - 2));
  }
  return frontOf(line, columns);
}

}  // namespace QELO::ExecProgram
