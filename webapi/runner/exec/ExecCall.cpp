#include "webapi/runner/exec/ExecCall.h"

#include <string>

namespace QELO {
namespace {

std::string textOf(const char* text) {
  return text != nullptr ? text : "";
}

}  // namespace

ExecParam ExecCall(int outputFd, const char* api, int version, const char* method,
                   const Json::Value& params, const Json::Value& attributes, const char* runner) {
  ExecParam param;
  param.SetParams(params)
      .SetAPI(textOf(api))
      .SetVersion(version)
      .SetMethod(textOf(method))
      .SetAttr(attributes)
      .SetRunner(textOf(runner))
      .SetOutputFd(outputFd);
  return param;
}

}  // namespace QELO
