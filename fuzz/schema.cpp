// A schema and a value, whatever they are: what is none is refused, what is checked ends, what fits
// fits again and stays what it is, and regular expressions take no more work than they may.
//
// An input is the schema's text, a line's end, and the value's text; "/" in front makes the rest of
// the first line a regular expression.

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "platform/schema/module/Pattern.h"
#include "platform/schema/module/SchemaModule.h"
#include "webapi/JsonHelper.h"

extern "C" QELO::Schema::Verdict webapiSchemaCheck(const Json::Value*,
                                                   std::vector<QELO::Schema::Fault>*);
extern "C" QELO::Schema::Verdict webapiSchemaApply(const Json::Value*, const Json::Value*,
                                                   Json::Value*, std::vector<QELO::Schema::Fault>*);

namespace {

using namespace QELO;
using Schema::Verdict;

constexpr size_t kMostWork = 2'000'000;

void require(bool isTrue, const char* what) {
  if (!isTrue) {
    fprintf(stderr, "wrong: %s\n", what);
    abort();
  }
}

void match(std::string_view expression, std::string_view text) {
  Platform::Pattern pattern;
  std::string reason;
  if (!Platform::Pattern::Read(expression, pattern, reason)) {
    require(!reason.empty(), "an expression refused without a reason");
    return;
  }
  size_t work = kMostWork;
  const bool isIn = pattern.IsIn(text, work);
  size_t again = kMostWork;
  require(pattern.IsIn(text, again) == isIn && work == again, "an expression that changes");
}

void checkFaults(const std::vector<Schema::Fault>& faults, Verdict verdict) {
  require((verdict == Verdict::kFits) == faults.empty(),
          "faults of what fits, or none of what does not");
  require(faults.size() <= Schema::kMostFaults, "too many faults");
  for (const Schema::Fault& fault : faults) {
    require(!fault.message.empty() && !fault.rule.empty(), "a fault without words");
    require(fault.path.empty() || fault.path[0] == '/', "a path that is none");
  }
}

void apply(const Json::Value& schema, Json::Value value) {
  std::vector<Schema::Fault> faults;
  const Verdict checked = webapiSchemaCheck(&schema, &faults);
  const Verdict verdict =
      webapiSchemaApply(&schema, &Json::Value::nullSingleton(), &value, &faults);
  require((checked == Verdict::kNoSchema) == (verdict == Verdict::kNoSchema), "two minds");
  checkFaults(faults, verdict);
  if (verdict != Verdict::kFits) {
    return;
  }
  Json::Value again = value;
  require(
      webapiSchemaApply(&schema, &Json::Value::nullSingleton(), &again, &faults) == Verdict::kFits,
      "what fits does not fit again");
  require(again == value, "what fits is changed again");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const size_t end = input.find('\n');
  if (end == std::string_view::npos) {
    return 0;
  }
  const std::string_view first = input.substr(0, end);
  const std::string_view second = input.substr(end + 1);
  if (first.substr(0, 1) == "/") {
    match(first.substr(1), second);
    return 0;
  }
  Json::Value schema;
  Json::Value value;
  if (JsonHelper::fromString(std::string(first), schema) &&
      JsonHelper::fromString(std::string(second), value)) {
    apply(schema, value);
  }
  return 0;
}
