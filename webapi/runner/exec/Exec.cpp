// API calls from code: the overloads that build the call.

#include "webapi/APIRunner.h"
#include "webapi/ExecHandler.h"
#include "webapi/ExecParam.h"

namespace QELO {
namespace {

constexpr int kNoOutput = -1;

std::string textOf(const char* text) {
  return text != nullptr ? text : "";
}

}  // namespace

Json::Value APIRunner::Exec(const ExecParam& param) {
  return ExecHandler(param).Process();
}

void APIRunner::Exec(Json::Value& result, int outputFd, const char* api, int version,
                     const char* method, const Json::Value& params, const Json::Value& attributes,
                     const char* runner) {
  ExecParam param;
  param.SetParams(params)
      .SetAPI(textOf(api))
      .SetVersion(version)
      .SetMethod(textOf(method))
      .SetAttr(attributes)
      .SetRunner(textOf(runner))
      .SetOutputFd(outputFd);
  result = Exec(param);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method,
                     const Json::Value& params, const Json::Value& attributes, const char* runner) {
  Exec(result, kNoOutput, api, version, method, params, attributes, runner);
}

void APIRunner::Exec(Json::Value& result, const char* api, int version, const char* method,
                     const Json::Value& params, const char* runner) {
  Exec(result, api, version, method, params, Json::Value(), runner);
}

}  // namespace QELO
