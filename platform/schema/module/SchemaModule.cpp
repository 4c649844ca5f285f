#include "platform/schema/module/SchemaModule.h"

#include "platform/schema/module/Faults.h"
#include "platform/schema/module/Reading.h"
#include "platform/schema/module/SchemaCheck.h"
#include "platform/schema/module/Validator.h"

using namespace QELO;
using namespace QELO::Platform;

extern "C" WEBAPI_API Schema::Verdict webapiSchemaCheck(const Json::Value* schema,
                                                        std::vector<Schema::Fault>* told) {
  told->clear();
  Faults faults(*told);
  SchemaCheck(*schema, faults).Check();
  return faults.IsEmpty() ? Schema::Verdict::kFits : Schema::Verdict::kNoSchema;
}

extern "C" WEBAPI_API Schema::Verdict webapiSchemaApply(const Json::Value* schema,
                                                        const Json::Value* sent, Json::Value* value,
                                                        std::vector<Schema::Fault>* told) {
  if (webapiSchemaCheck(schema, told) != Schema::Verdict::kFits) {
    return Schema::Verdict::kNoSchema;
  }
  Reading(*schema).Read(*sent, *value);
  Faults faults(*told);
  return Validator(*schema, faults).Fits(*value) ? Schema::Verdict::kFits
                                                 : Schema::Verdict::kFaulty;
}
