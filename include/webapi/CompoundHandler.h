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
/// (one after the other only). What an entry does not name of "api", "version" and "method" is as
/// the entry before it left it. An entry whose credentials cannot be given back after it, and every
/// entry of a parallel request, runs in a forked child.
///
/// A request with more entries than the host's settings allow, those of compound requests within it
/// counted, answers 110 before any of them runs. When the answer goes to standard output and nobody
/// reads that any more, or the parent that waits for it has gone, entries that have not begun are
/// left out.
class WEBAPI_API CompoundHandler {
 public:
  /// The three are not owned and outlive the handler.
  CompoundHandler(APIRequest* request, APIResponse* response, APIRunner* runner);
  CompoundHandler(const CompoundHandler&) = delete;
  CompoundHandler& operator=(const CompoundHandler&) = delete;
  virtual ~CompoundHandler();

  /// Runs all entries and fills the outer response: success with the combined answer, or error 110
  /// without a list of entries or with too many of them, and 117 for want of memory, with the last
  /// refusal's reason or "" as its data. The entries' callbacks that are this process's to run
  /// become the outer response's.
  /// @return whether every step succeeded; an entry that fails does not count
  bool Process();

 protected:
  /// A child's pipe and the index of its entry.
  using Child = std::pair<Pipe*, unsigned>;

  /// The steps of Process(), in order. Those with a number give 0 or the error of the whole
  /// request.
  ///
  /// Reads "mode", "stop_when_error" and "compound". The list is used where it stands, in the outer
  /// request's record. @return 110 when it is no array
  int ParseParams();
  /// Makes the request and response that all entries share: the outer request's environment, caller
  /// and attributes, as a POST without a query. @return 117 when there is no memory
  int PrepareNewCompReqResp();
  /// Opens the API libraries of all entries, nested ones too, before any runs, so that the children
  /// find them open. Standard streams are shut meanwhile; a library that cannot be opened is left
  /// for its entry to fail with.
  void PreloadLibs();
  /// @param top  whether `value` is the list itself; else an entry, whose own "compound" is
  ///             walked in its place
  void PreloadLibs(const Json::Value& value, bool top);
  /// Runs the entries in order, and takes the children's answers when all were started.
  /// @return 0, whatever became of the entries
  int CompoundProcess();
  /// Runs one entry, or refuses it: 112 after a failure with "stop_when_error", 113 for a method
  /// that uploads or downloads. Its answer stands at `index` afterwards; in "parallel" mode that is
  /// error 117 until the child's has come.
  /// @return 0, or the error of an entry that was not run
  int CompoundProcessEntry(const Json::Value& entry, unsigned index);
  /// Makes the pipe of a child to come. It is the handler's until it is destroyed, on failure too.
  /// @param child  receives the pipe and `index`
  /// @return false when the pipe could not be opened (logged)
  bool InitNewPipe(Child& child, unsigned index);
  /// Makes the child, which runs the entry, sends its answer and ends: it does not return. It keeps
  /// the standard streams; its callbacks wait for the end of this process.
  /// @return false, with the pipe closed, when there is no child
  bool ProcessFork(Child& child);
  /// Puts the entry response into the answer at `index`.
  void PrepareCompundResponse(unsigned index);
  /// @param result  receives the entry's body, with "api", "version" and "method" when it has all
  ///                three
  /// @param info    receives {"error": code, "restart_httpd": bool} and, when there is one, the
  ///                server error as "x-request-error"
  void PrepareCompundResponse(Json::Value& result, Json::Value& info);
  /// Waits for a child's answer and puts it into its place. One that cannot be read (logged) leaves
  /// what stood there, or null, and counts as failed.
  void PrepareCompundResponseFromChild(Child& child);
  /// Takes what the entries ask of the outer response: the last server error, a restart of the web
  /// server; and finds whether one failed.
  void HandleCompoundInfo();
  /// Fills the outer response. @param code  0, or the error of the whole request
  void Output(_tag_WEBAPI_ERR code);

 private:
  void PrepareEnvironment();
  void RepairRequest();
  /// @return the error for a request with too many entries
  int RefuseSize();
  bool IsClientGone() const;
  void KeepCaller();
  void RestoreCaller();
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
  unsigned entryCount_ = 0;  ///< at all levels
  Json::Value caller_;       ///< the entry request's, before any entry's permission was asked
};

}  // namespace QELO
