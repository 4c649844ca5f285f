#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include "platform/schema/module/Place.h"
#include "webapi/platform/Schema.h"

namespace QELO::Platform {

/// What is wrong, as far as it is told: each fault once, and no more than there is room for.
class Faults {
 public:
  explicit Faults(std::vector<Schema::Fault>& told) : told_(told) {}

  void Add(const Place& place, const char* rule, const std::string& message) {
    AddPath(place.Path(), rule, message);
  }
  void AddPath(const std::string& path, const char* rule, const std::string& message) {
    const bool isTold = std::any_of(told_.begin(), told_.end(), [&](const Schema::Fault& fault) {
      return fault.path == path && fault.rule == rule;
    });
    if (!isTold && told_.size() < Schema::kMostFaults) {
      told_.push_back({path, rule, message});
    }
  }
  bool IsEmpty() const { return told_.empty(); }

 private:
  std::vector<Schema::Fault>& told_;
};

}  // namespace QELO::Platform
