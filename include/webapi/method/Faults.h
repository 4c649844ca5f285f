#pragma once

#include <json/json.h>

#include <cstddef>
#include <string>
#include <utility>

#include "webapi/JsonHelper.h"

namespace QELO::method {

/// Where a value stands within the parameters; put into words only when there is a fault.
struct Path {
  const Path* above = nullptr;  ///< null: the parameters themselves
  const char* name = nullptr;   ///< of the member; null: one of a list
  size_t index = 0;             ///< in the list

  /// "/tags/3"
  [[gnu::cold]] std::string Text() const {
    if (above == nullptr) {
      return "";
    }
    return above->Text() + "/" + (name != nullptr ? name : std::to_string(index));
  }
};

/// What is wrong with a call's parameters, all of it: the "errors" of error 101.
class Faults {
 public:
  static constexpr unsigned kMost = 100;  ///< told ones; a list may hold thousands of wrong values

  /// @param rule   the word of JSON Schema for it, as "maximum"
  /// @param wants  what the value should be, for people
  [[gnu::cold, gnu::noinline]] void Add(const Path& path, const char* rule,
                                        const std::string& wants) {
    ++count_;
    if (list_.size() < kMost) {
      Json::Value fault(Json::objectValue);
      fault["path"] = path.Text();
      fault["rule"] = rule;
      fault["message"] = wants;
      list_.append(std::move(fault));
    }
  }
  /// As above, with a bound and what it counts behind the words.
  [[gnu::cold, gnu::noinline]] void Add(const Path& path, const char* rule, const char* wants,
                                        const Json::Value& bound, const char* what = "") {
    Add(path, rule, wants + JsonHelper::asString(bound) + what);
  }

  /// How many there are, those beyond kMost too.
  unsigned Count() const { return count_; }
  /// A list of objects {"path", "rule", "message"}.
  const Json::Value& List() const { return list_; }

 private:
  Json::Value list_ = Json::Value(Json::arrayValue);
  unsigned count_ = 0;
};

}  // namespace QELO::method
