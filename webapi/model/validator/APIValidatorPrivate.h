#pragma once

#include <regex.h>

#include <map>
#include <memory>

namespace QELO {

/// The regular expressions that were asked for, by the address of their pattern.
class APIValidatorPrivate {
 public:
  /// @param compiled  receives the expression, which is ours; unchanged on failure
  /// @return false when the pattern cannot be compiled (logged)
  bool GetRegex(const char* pattern, const regex_t*& compiled);

 private:
  struct Release {
    void operator()(regex_t* expression) const;
  };
  std::map<const char*, std::unique_ptr<regex_t, Release>> cache_;
};

}  // namespace QELO
