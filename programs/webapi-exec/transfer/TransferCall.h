#pragma once

#include <string>

#include "programs/webapi-exec/transfer/ByteProgress.h"
#include "programs/webapi-exec/transfer/OutputFile.h"
#include "webapi/ExecHandler.h"

namespace QELO::ExecProgram {

/// A call whose output goes to a file, with its progress on the terminal, and whose upload comes on
/// standard input.
class TransferCall : public ExecHandler {
 public:
  /// @param param   outlives the call, and writes to the file's descriptor
  /// @param isSeen  whether the progress of the output is shown
  TransferCall(const ExecParam& param, OutputFile& file, bool isSeen);

  /// After Process(): whether as much came as was announced.
  bool IsWhole() const { return progress_.IsWhole(); }

 protected:
  void OutputBegins(const std::string& head) override;
  void OutputGrows(size_t bytes) override;
  bool HandleUpload(APIRunner& runner, APIRequest* request, APIResponse* response) override;
  void CallEnded() override;

 private:
  OutputFile& file_;
  ByteProgress progress_;
  APIRequest* uploaded_ = nullptr;  ///< the request that an upload came with
};

}  // namespace QELO::ExecProgram
