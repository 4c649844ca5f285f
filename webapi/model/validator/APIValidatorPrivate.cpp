#include "webapi/model/validator/APIValidatorPrivate.h"

#include <syslog.h>

#include <utility>

namespace QELO {
namespace {

constexpr int kPatternLine = 57;  ///< administrators' log filters know the message by this line

}  // namespace

void APIValidatorPrivate::Release::operator()(regex_t* expression) const {
  regfree(expression);
  delete expression;
}

bool APIValidatorPrivate::GetRegex(const char* pattern, const regex_t*& compiled) {
  const auto known = cache_.find(pattern);
  if (known != cache_.end()) {
    compiled = known->second.get();
    return true;
  }
  auto expression = std::make_unique<regex_t>();
  if (regcomp(expression.get(), pattern, REG_EXTENDED | REG_NOSUB) != 0) {
    syslog(LOG_ERR, "%s:%d Invalid pattern", "APIValidator", kPatternLine);
    return false;
  }
  std::unique_ptr<regex_t, Release> kept(expression.release());
  compiled = cache_.emplace(pattern, std::move(kept)).first->second.get();
  return true;
}

}  // namespace QELO
