#include "webapi/transfer/upload/TemporaryFiles.h"

#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "webapi/JsonHelper.h"

namespace QELO {

void RemoveTemporaryFiles(const Json::Value& paths) {
  if (!paths.isArray()) {
    return;
  }
  for (const Json::Value& each : paths) {
    const std::string path = JsonHelper::asString(each);
    struct stat info {};
    if (lstat(path.c_str(), &info) == 0 && S_ISREG(info.st_mode)) {
      unlink(path.c_str());
    }
  }
}

}  // namespace QELO
