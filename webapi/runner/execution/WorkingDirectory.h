#pragma once

#include "webapi/base/FileIdentity.h"

namespace QELO {

/// Goes back at the end to the working directory there was at the start; when it cannot, that is
/// logged.
class WorkingDirectory {
 public:
  WorkingDirectory();
  WorkingDirectory(const WorkingDirectory&) = delete;
  WorkingDirectory& operator=(const WorkingDirectory&) = delete;
  ~WorkingDirectory();

 private:
  int directory_;
  FileIdentity identity_;
};

}  // namespace QELO
