// Real, since what becomes of a value is what tests look at; but they may take the host's reader of
// schemas away.

#include "platform/schema/module/SchemaModule.h"
#include "tests/support/FakePlatform.h"
#include "webapi/platform/Schema.h"

namespace QELO {

extern "C" Schema::Verdict webapiSchemaCheck(const Json::Value*, std::vector<Schema::Fault>*);
extern "C" Schema::Verdict webapiSchemaApply(const Json::Value*, const Json::Value*, Json::Value*,
                                             std::vector<Schema::Fault>*);

namespace Schema {

Verdict Check(const Json::Value& schema, std::vector<Fault>& faults) {
  FakePlatform::Get().calls.emplace_back("Schema::Check");
  return FakePlatform::Get().readsSchemas ? webapiSchemaCheck(&schema, &faults)
                                          : Verdict::kUnreadable;
}

Verdict Apply(const Json::Value& schema, const Json::Value& sent, Json::Value& value,
              std::vector<Fault>& faults) {
  FakePlatform::Get().calls.emplace_back("Schema::Apply");
  return FakePlatform::Get().readsSchemas ? webapiSchemaApply(&schema, &sent, &value, &faults)
                                          : Verdict::kUnreadable;
}

}  // namespace Schema
}  // namespace QELO
