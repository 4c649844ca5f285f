#pragma once

#include <json/json.h>

#include "webapi/model/APIBase.h"

namespace QELO {

/// The state of an ExecParam.
///
/// Sections: "params" (the API's parameters with "api", "version", "method"), "env" (CGI
/// variables), "attr" (the request's attributes), "runner" ("username") and "output" ("fd").
class ExecParamPrivate : public APIBase {
 public:
  ExecParamPrivate();

  /// Takes a record; sections that it lacks are made.
  void Restore(const Json::Value& record);
};

}  // namespace QELO
