#pragma once

#include <ctime>
#include <string>

namespace QELO::Platform {

/// What tells one state of a content from another.
struct Validators {
  std::string tag;         ///< entity tag with its quotes; "": there is none
  time_t modified = -1;    ///< -1: not known
  bool isSettled = false;  ///< changed long enough ago that `modified` can mean nothing else
};

enum class Verdict { kSend, kNotModified, kFailed };

/// Whether the request's conditions let the content be sent.
Verdict checkConditions(const Validators& content);

/// Whether ranges may be sent: the client's part, if it has named one, is of this very content.
bool checkIfRange(const Validators& content);

/// A variable of the process environment, "" when it is not set.
const char* requestText(const char* variable);
bool isMethod(const char* method);

}  // namespace QELO::Platform
