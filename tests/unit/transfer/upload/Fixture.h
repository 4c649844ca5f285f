#pragma once

#include <gtest/gtest.h>

#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/transfer/upload/ScarceHost.h"
#include "webapi/APIRequest.h"
#include "webapi/APIUpload.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Paths.h"

namespace QELO {

inline constexpr unsigned long long kMargin = 5242880;
inline constexpr unsigned long long kReserve = 209715200;

/// A host with a gigabyte in /tmp, no volume, and a request whose body has 1,000 bytes.
class UploadTest : public testing::Test {
 protected:
  UploadTest() : request(Environment("1000")) {
    platform.upload = FakeUpload();
    SyslogCapture::Clear();
    host.freeBytes = {{Paths::kTmp, 1ULL << 30}, {Paths::kRoot, 1ULL << 30}};
  }

  static Json::Value Environment(const std::string& length) {
    Json::Value record(Json::objectValue);
    record["environ"]["CONTENT_LENGTH"] = length;
    return record;
  }
  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(JsonHelper::fromString(text, value)) << text;
    return value;
  }
  int CountCalls(const std::string& operation) const {
    int count = 0;
    for (const std::string& call : platform.calls) {
      count += call.rfind(operation + "(", 0) == 0 ? 1 : 0;
    }
    return count;
  }

  FakePlatform& platform = FakePlatform::Reset();
  FakeUpload& fake = platform.upload;
  ScarceHost host;
  APIRequest request;
  Json::Value params{Json::objectValue};
  Json::Value files{Json::arrayValue};
};

}  // namespace QELO
