#pragma once

#include <cstdint>
#include <string>

#include "programs/webapi-exec/follow/ProgressScreen.h"
#include "programs/webapi-exec/transfer/OutputFile.h"
#include "webapi/ExecHandler.h"

namespace QELO::ExecProgram {

/// A call whose output goes to a file, with its progress on the terminal.
class DownloadCall : public ExecHandler {
 public:
  /// @param param   outlives the call, and writes to the file's descriptor
  /// @param isSeen  whether the progress is shown
  DownloadCall(const ExecParam& param, OutputFile& file, bool isSeen);

  /// After Process(): whether as much came as was announced.
  bool IsWhole() const { return file_.Total() == 0 || done_ == file_.Total(); }

 protected:
  void OutputBegins(const std::string& head) override;
  void OutputGrows(size_t bytes) override;

 private:
  Progress Now() const;

  OutputFile& file_;
  const bool isSeen_;
  ProgressScreen screen_;
  bool hasBegun_ = false;
  uint64_t done_ = 0;
};

}  // namespace QELO::ExecProgram
