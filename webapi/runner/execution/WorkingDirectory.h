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

  /// Whether there is a way back. Otherwise no foreign code may run: descriptions are looked up in
  /// the working directory.
  bool IsSaved() const { return directory_ >= 0; }

 private:
  int directory_;
  FileIdentity identity_;
};

}  // namespace QELO
