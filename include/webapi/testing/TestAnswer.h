#pragma once

#include <json/json.h>
#include <sys/types.h>

#include <iosfwd>
#include <string>
#include <vector>

namespace QELO {

/// What a call answered on a made-up host, and how its method ran there.
struct TestAnswer {
  int status = 0;                    ///< of HTTP
  std::vector<std::string> headers;  ///< the lines, without the status's
  std::string body;                  ///< as it was sent: JSON, or a file

  bool isCalled = false;  ///< whether the method was called; else something refused the call before
  std::string account;    ///< that the method had the rights of; "" when not called
  uid_t uid = 0;          ///< the effective ids that it had
  gid_t gid = 0;

  bool IsSuccess() const;
  /// The code of the error; 0 for success, -1 when the body is no JSON.
  int Code() const;
  /// Of the body: its "data", or the "errors" of its error; null when there is none.
  Json::Value Data() const;
  Json::Value Errors() const;
  /// The header's value, its name in any capitals; "" when there is none.
  std::string Header(const std::string& name) const;
};

/// For the messages of failed tests.
std::ostream& operator<<(std::ostream& stream, const TestAnswer& answer);

}  // namespace QELO
