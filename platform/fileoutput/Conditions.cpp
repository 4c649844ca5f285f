#include "platform/fileoutput/Conditions.h"

#include <cstdlib>
#include <cstring>
#include <string_view>

#include "platform/fileoutput/HttpDate.h"
#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr std::string_view kWeak = "W/";

/// Takes the first entity tag off a list. @return "" at the end, and where no tag follows
std::string_view takeTag(std::string_view& list) {
  while (!list.empty() && (list.front() == ',' || list.front() == ' ' || list.front() == '\t')) {
    list.remove_prefix(1);
  }
  const size_t quote = list.starts_with(kWeak) ? kWeak.size() : 0;
  const size_t end = list.size() > quote && list[quote] == '"' ? list.find('"', quote + 1)
                                                               : std::string_view::npos;
  const std::string_view tag = end == std::string_view::npos ? "" : list.substr(0, end + 1);
  list.remove_prefix(tag.size());
  return tag;
}

/// Whether two tags stand for the same bytes.
bool isSame(std::string_view left, std::string_view right) {
  return !left.starts_with(kWeak) && left == right;
}

/// Whether two tags stand for contents that are as good as each other.
bool isAlike(std::string_view left, std::string_view right) {
  left.remove_prefix(left.starts_with(kWeak) ? kWeak.size() : 0);
  right.remove_prefix(right.starts_with(kWeak) ? kWeak.size() : 0);
  return left == right;
}

template <typename Compare>
bool lists(std::string_view list, const std::string& tag, Compare compare) {
  list = Trim(list);
  if (list == "*") {
    return true;
  }
  for (std::string_view one = takeTag(list); !one.empty(); one = takeTag(list)) {
    if (compare(one, tag)) {
      return true;
    }
  }
  return false;
}

/// Whether the header holds a date that the content can be compared with.
bool readDate(const char* variable, const Validators& content, time_t& date) {
  return content.modified >= 0 && parseHttpDate(Trim(requestText(variable)), date);
}

}  // namespace

const char* requestText(const char* variable) {
  const char* text = getenv(variable);
  return text != nullptr ? text : "";
}

bool isMethod(const char* method) {
  return strcmp(requestText("REQUEST_METHOD"), method) == 0;
}

Verdict checkConditions(const Validators& content) {
  const std::string_view match = requestText("HTTP_IF_MATCH");
  const std::string_view noneMatch = requestText("HTTP_IF_NONE_MATCH");
  const bool reads = isMethod("GET") || isMethod("HEAD");
  time_t date = 0;
  if (isMethod("")) {
    return Verdict::kSend;  // a call from code
  }
  if (!match.empty()) {
    if (!lists(match, content.tag, isSame)) {
      return Verdict::kFailed;
    }
  } else if (readDate("HTTP_IF_UNMODIFIED_SINCE", content, date) && content.modified > date) {
    return Verdict::kFailed;
  }
  if (!noneMatch.empty()) {
    if (lists(noneMatch, content.tag, isAlike)) {
      return reads ? Verdict::kNotModified : Verdict::kFailed;
    }
  } else if (reads && readDate("HTTP_IF_MODIFIED_SINCE", content, date) &&
             content.modified <= date) {
    return Verdict::kNotModified;
  }
  return Verdict::kSend;
}

bool checkIfRange(const Validators& content) {
  const std::string_view wanted = Trim(requestText("HTTP_IF_RANGE"));
  if (wanted.empty()) {
    return true;
  }
  time_t date = 0;
  if (parseHttpDate(wanted, date)) {
    return content.isSettled && content.modified == date;
  }
  return isSame(wanted, content.tag);
}

}  // namespace QELO::Platform
