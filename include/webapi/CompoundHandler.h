#pragma once

#include <json/json.h>

#include <list>
#include <memory>
#include <string>
#include <utility>

#include "webapi/Export.h"
#include "webapi/WebAPIError.h"

namespace QELO {

class APIRequest;
class APIResponse;
class APIRunner;
class Pipe;

/// Runs one compound request: a list of API calls, in order or all at once, with one combined
/// answer {"has_fail": bool, "result": [...]} in the order of the entries.
///
/// The request's parameters: "compound" (array of objects with "api", "version", "method" and the
/// method's own), "mode" ("parallel"; anything else: one after the other) and "stop_when_error"
/// (one after the other only). An entry whose credentials cannot be given back after it, and every
/// entry of a parallel request, runs in a forked child.
class WEBAPI_API CompoundHandler {
 public:
  /// The three are not owned and outlive the handler.
  CompoundHandler(APIRequest* request, APIResponse* response, APIRunner* runner);
  CompoundHandler(const CompoundHandler&) = delete;
  CompoundHandler& operator=(const CompoundHandler&) = delete;
  virtual ~CompoundHandler();

  /// Runs all entries and fills the outer response.
  /// @return whether every step succeeded; an entry that fails does not count
  bool Process();

 protected:
  /// A child's pipe and the index of its entry.
  using Child = std::pair<Pipe*, unsigned>;

  int ParseParams();
  int PrepareNewCompReqResp();
  void PreloadLibs();
  void PreloadLibs(const Json::Value& value, bool top);
  int CompoundProcess();
  int CompoundProcessEntry(const Json::Value& entry, unsigned index);
  bool InitNewPipe(Child& child, unsigned index);
  bool ProcessFork(Child& child);
  /// Puts the entry response into the answer at `index`.
  void PrepareCompundResponse(unsigned index);
  void PrepareCompundResponse(Json::Value& result, Json::Value& info);
  void PrepareCompundResponseFromChild(Child& child);
  void HandleCompoundInfo();
  void Output(_tag_WEBAPI_ERR code);

 private:
  void PrepareEnvironment();
  void RepairRequest();
  void TakeEntry(const Json::Value& entry);
  int RefuseEntry(int code, const char* message, unsigned index);
  int ForkEntry(unsigned index);
  /// An exception must end the child here: the code around the caller is the parent's.
  [[noreturn]] void RunChild(Pipe& pipe, int parent) noexcept;
  void SendAnswer(Pipe& pipe);

  APIRequest* request_;
  APIResponse* response_;
  APIRunner* runner_;
  std::unique_ptr<APIRequest> entryRequest_;
  std::unique_ptr<APIResponse> entryResponse_;
  bool stopWhenError_ = false;
  bool parallel_ = false;
  bool hasFail_ = false;
  const Json::Value* entries_ = nullptr;
  Json::Value data_;
  Json::Value info_;
  std::list<Child> children_;
  std::string message_;
};

}  // namespace QELO
