#include "platform/fileoutput/HttpDate.h"

#include <algorithm>
#include <cstdio>
#include <iterator>

namespace QELO::Platform {
namespace {

constexpr size_t kLongest = 40;  ///< bytes; the longest form has 33
constexpr const char* kDays[] = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
constexpr const char* kMonths[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                   "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

/// The year that two digits mean: none that is more than 50 years ahead.
int yearOf(int twoDigits) {
  const time_t now = time(nullptr);
  tm today{};
  gmtime_r(&now, &today);
  const int thisYear = today.tm_year + 1900;
  const int year = thisYear - thisYear % 100 + twoDigits;
  return year > thisYear + 50 ? year - 100 : year;
}

bool isWithin(int number, int lowest, int highest) {
  return number >= lowest && number <= highest;
}

struct Fields {
  char month[4] = {};
  int year = 0;
  tm time{};
};

/// Reads the fields of one of the forms.
bool readFields(const char* text, int length, Fields& fields) {
  tm& time = fields.time;
  int end = 0;
  if (sscanf(text, "%*3[A-Za-z], %2d %3[A-Za-z] %4d %2d:%2d:%2d GMT%n", &time.tm_mday, fields.month,
             &fields.year, &time.tm_hour, &time.tm_min, &time.tm_sec, &end) == 6 &&
      end == length) {
    return true;
  }
  end = 0;
  if (sscanf(text, "%*9[A-Za-z], %2d-%3[A-Za-z]-%2d %2d:%2d:%2d GMT%n", &time.tm_mday, fields.month,
             &fields.year, &time.tm_hour, &time.tm_min, &time.tm_sec, &end) == 6 &&
      end == length && isWithin(fields.year, 0, 99)) {
    fields.year = yearOf(fields.year);
    return true;
  }
  end = 0;
  return sscanf(text, "%*3[A-Za-z] %3[A-Za-z] %2d %2d:%2d:%2d %4d%n", fields.month, &time.tm_mday,
                &time.tm_hour, &time.tm_min, &time.tm_sec, &fields.year, &end) == 6 &&
         end == length;
}

}  // namespace

std::string formatHttpDate(time_t time) {
  tm fields{};
  if (gmtime_r(&time, &fields) == nullptr || !isWithin(fields.tm_year + 1900, 1, 9999)) {
    return "";
  }
  char text[kLongest];
  snprintf(text, sizeof text, "%s, %02d %s %04d %02d:%02d:%02d GMT", kDays[fields.tm_wday],
           fields.tm_mday, kMonths[fields.tm_mon], fields.tm_year + 1900, fields.tm_hour,
           fields.tm_min, fields.tm_sec);
  return text;
}

bool parseHttpDate(std::string_view text, time_t& time) {
  const std::string copy(text.substr(0, kLongest));
  Fields fields;
  if (text.size() > kLongest || !readFields(copy.c_str(), static_cast<int>(copy.size()), fields)) {
    return false;
  }
  const auto month =
      std::find(std::begin(kMonths), std::end(kMonths), std::string_view(fields.month));
  tm& parts = fields.time;
  if (month == std::end(kMonths) || !isWithin(fields.year, 1, 9999) ||
      !isWithin(parts.tm_mday, 1, 31) || !isWithin(parts.tm_hour, 0, 23) ||
      !isWithin(parts.tm_min, 0, 59) || !isWithin(parts.tm_sec, 0, 60)) {
    return false;
  }
  parts.tm_mon = static_cast<int>(month - std::begin(kMonths));
  parts.tm_year = fields.year - 1900;
  time = timegm(&parts);
  return true;
}

}  // namespace QELO::Platform
