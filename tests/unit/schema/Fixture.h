#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "platform/schema/module/SchemaModule.h"
#include "webapi/JsonHelper.h"

extern "C" QELO::Schema::Verdict webapiSchemaCheck(const Json::Value*,
                                                   std::vector<QELO::Schema::Fault>*);
extern "C" QELO::Schema::Verdict webapiSchemaApply(const Json::Value*, const Json::Value*,
                                                   Json::Value*, std::vector<QELO::Schema::Fault>*);

namespace QELO::Platform {

inline Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
  return value;
}

/// What is wrong, as "path rule" each.
inline std::vector<std::string> Told(const std::vector<Schema::Fault>& faults) {
  std::vector<std::string> told;
  for (const Schema::Fault& fault : faults) {
    EXPECT_FALSE(fault.message.empty()) << fault.path;
    told.push_back(fault.path + " " + fault.rule);
  }
  return told;
}

inline std::vector<std::string> FaultsOf(const Json::Value& schema, Json::Value value) {
  std::vector<Schema::Fault> faults;
  const Schema::Verdict verdict =
      webapiSchemaApply(&schema, &Json::Value::nullSingleton(), &value, &faults);
  EXPECT_NE(verdict, Schema::Verdict::kNoSchema) << (faults.empty() ? "" : faults[0].message);
  EXPECT_EQ(verdict == Schema::Verdict::kFits, faults.empty());
  return Told(faults);
}

inline std::vector<std::string> FaultsOf(const std::string& schema, const std::string& value) {
  return FaultsOf(Parse(schema), Parse(value));
}

inline std::vector<std::string> SchemaFaults(const std::string& schema) {
  std::vector<Schema::Fault> faults;
  const Json::Value value = Parse(schema);
  webapiSchemaCheck(&value, &faults);
  return Told(faults);
}

using Lines = std::vector<std::string>;

}  // namespace QELO::Platform
