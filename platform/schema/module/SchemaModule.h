#pragma once

#include "webapi/platform/Schema.h"

namespace QELO::Platform {

inline constexpr char kSchemaModule[] = "schema.so";

/// What the module offers: the operations of the seam by the same contract.
using SchemaCheckCall = Schema::Verdict (*)(const Json::Value*, std::vector<Schema::Fault>*);
inline constexpr char kSchemaCheck[] = "webapiSchemaCheck";
using SchemaApplyCall = Schema::Verdict (*)(const Json::Value*, const Json::Value*, Json::Value*,
                                            std::vector<Schema::Fault>*);
inline constexpr char kSchemaApply[] = "webapiSchemaApply";

}  // namespace QELO::Platform
