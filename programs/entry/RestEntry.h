#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/HttpStatus.h"
#include "webapi/WebEntry.h"

namespace QELO {

/// Serves one address a method, for clients that are made from a description: the path names the
/// call, "/QELO.Host.Info/v1/get", the body of a POST is a JSON object of its parameters, and the
/// HTTP status tells errors. All else is as with WebEntry; credentials come in the query, cookies
/// or header lines.
class RestEntry : public WebEntry {
 public:
  static std::unique_ptr<WebEntry> Make() { return std::make_unique<RestEntry>(); }

  bool Initialize(const Json::Value& param) override;

 private:
  /// Reads the body off standard input.
  /// @return false with the error set
  bool TakeBody(Json::Value& params);
  /// @return false
  bool Refuse(int code, _tag_HTTP_STATUS_CODE status, const char* rule = "",
              const char* message = "");
};

}  // namespace QELO
