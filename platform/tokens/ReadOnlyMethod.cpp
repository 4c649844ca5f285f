#include "platform/tokens/ReadOnlyMethod.h"

#include <json/json.h>

#include "platform/base/Paths.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/DescriptionFile.h"
#include "webapi/base/OwnFile.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::Platform {

bool isReadOnlyMethod(const std::string& api, const std::string& method) {
  const std::string directory = Paths::kDescriptionDir;
  const std::string file = DescriptionFile(api, [&](const std::string& name) {
    return QLIBCFileExist((directory + name).c_str()) == 1;
  });
  Json::Value descriptions;
  if (file.empty() || OthersMayChange(directory + file) ||
      !WebAPIUtil::ReadJsonFile(directory + file, descriptions)) {
    return false;
  }
  bool isListed = false;
  const Json::Value& versions =
      JsonHelper::member(JsonHelper::member(descriptions, api), "methods");
  for (const Json::Value& list : versions) {
    for (const Json::Value& entry : list) {
      const Json::Value* attributes = JsonHelper::find(entry, method);
      if (JsonHelper::isText(entry, method) ||
          (attributes != nullptr &&
           JsonHelper::member(*attributes, "readOnly") != Json::Value(true))) {
        return false;
      }
      isListed = isListed || attributes != nullptr;
    }
  }
  return isListed;
}

}  // namespace QELO::Platform
