#pragma once

#include <cstdlib>
#include <map>
#include <string>

#include "tests/support/Printed.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/FileOutput.h"

namespace QELO {

/// A private root with the file "content", ten digits that were written long ago, and a CGI
/// environment with GET.
class FileOutput : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    SyslogCapture::Clear();
    ClearRequest();
    setenv("REQUEST_METHOD", "GET", 1);
    Put("content", "0123456789");
    HTTP::FileOutputerHelper::SetFastOutputEnabled(true);
  }
  void TearDown() override { ClearRequest(); }

  static void ClearRequest() {
    for (const char* name :
         {"REQUEST_METHOD", "GATEWAY_INTERFACE", "HTTP_RANGE", "HTTP_IF_RANGE", "HTTP_IF_MATCH",
          "HTTP_IF_NONE_MATCH", "HTTP_IF_MODIFIED_SINCE", "HTTP_IF_UNMODIFIED_SINCE"}) {
      unsetenv(name);
    }
  }

  /// A file that was written long ago.
  static void Put(const std::string& name, const std::string& text, long age = 3600) {
    Write(name, text, 0644);
    Age(name, age);
  }

  /// The answer with a file of the root, to a request with these headers.
  CgiAnswer Send(const std::string& name, const std::map<std::string, std::string>& request = {},
                 const std::vector<std::string>& lines = {}) {
    for (const auto& [variable, value] : request) {
      setenv(variable.c_str(), value.c_str(), 1);
    }
    CgiAnswer answer = PrintedBy([&] {
      HTTPFileOutputer outputer;
      for (const std::string& line : lines) {
        outputer.AddHeader(line);
      }
      result = outputer.Output(Path(name), "text/plain");
    });
    for (const auto& [variable, value] : request) {
      unsetenv(variable.c_str());
    }
    setenv("REQUEST_METHOD", "GET", 1);
    return answer;
  }

  CgiAnswer SendStream(std::FILE* stream, const std::vector<std::string>& lines = {}) {
    return PrintedBy([&] {
      HTTPFileOutputer outputer;
      for (const std::string& line : lines) {
        outputer.AddHeader(line);
      }
      result = outputer.Output(stream, "", "text/plain");
    });
  }

  /// The value of a header line, "(none)" without one. A second one is a failure.
  static std::string Header(const CgiAnswer& answer, const std::string& name) {
    const std::string head = "\r\n" + answer.Head() + "\r\n";
    const std::string start = "\r\n" + name + ": ";
    const size_t line = head.find(start);
    if (line == std::string::npos) {
      return "(none)";
    }
    EXPECT_EQ(head.find(start, line + 1), std::string::npos) << answer.text;
    const size_t value = line + start.size();
    return head.substr(value, head.find("\r\n", value) - value);
  }

  static std::string Status(const CgiAnswer& answer) {
    const std::string status = Header(answer, "Status");
    return status == "(none)" ? "200" : status.substr(0, 3);
  }

  int result = 1;  ///< of the last output
};

}  // namespace QELO
