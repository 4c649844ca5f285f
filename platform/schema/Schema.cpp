#include "webapi/platform/Schema.h"

#include "platform/base/ModuleLoader.h"
#include "platform/schema/module/SchemaModule.h"

namespace QELO::Schema {

Verdict Check(const Json::Value& schema, std::vector<Fault>& faults) {
  using namespace Platform;
  const auto check = reinterpret_cast<SchemaCheckCall>(findInModule(kSchemaModule, kSchemaCheck));
  return check != nullptr ? check(&schema, &faults) : Verdict::kUnreadable;
}

Verdict Apply(const Json::Value& schema, const Json::Value& sent, Json::Value& value,
              std::vector<Fault>& faults) {
  using namespace Platform;
  const auto apply = reinterpret_cast<SchemaApplyCall>(findInModule(kSchemaModule, kSchemaApply));
  return apply != nullptr ? apply(&schema, &sent, &value, &faults) : Verdict::kUnreadable;
}

}  // namespace QELO::Schema
