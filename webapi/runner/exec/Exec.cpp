// Calls from code, in the forms that the runner offers.

#include "webapi/APIRunner.h"
#include "webapi/ExecHandler.h"
#include "webapi/runner/exec/ExecCall.h"

namespace QELO {

Json::Value APIRunner::Exec(const ExecParam& param) {
  return ExecHandler(param).Process();
}

void APIRunner::Exec(Json::Value& result, int outputFd, const char* api, int version,
                     const char* method, const Json::Value& params, const Json::Value& attributes,
                     const char* runner) {
  result = Exec(ExecCall(outputFd, api, version, method, params, attributes, runner));
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method,
                     const Json::Value& params, const Json::Value& attributes, const char* runner) {
  Exec(result, -1, api, version, method, params, attributes, runner);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method,
                     const Json::Value& params, const char* runner) {
  Exec(result, api, version, method, params, Json::Value(), runner);
}

}  // namespace QELO
