// The web entry's output: header lines and body on standard output, and the restart of the web
// server that may follow.

#include <stdio_ext.h>

#include <cstdio>
#include <string>

#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebEntry.h"
#include "webapi/base/Utf8.h"
#include "webapi/entry/output/HeaderLines.h"
#include "webapi/platform/WebServer.h"

namespace QELO {
namespace {

/// Sent with every answer: it is nobody else's to guess its type, show it or keep it.
constexpr const char* kFixedLines[] = {
    "X-Content-Type-Options: nosniff",
    "X-XSS-Protection: 1; mode=block",
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate",
    "Pragma: no-cache",
    "Expires: 0",
};

void print(const std::string& text) {
  fwrite(text.data(), 1, text.size(), stdout);
}

void printLine(const std::string& line) {
  print(line + "\r\n");
}

}  // namespace

void WebEntry::OutputHeader() {
  for (const std::string& line : HeaderLines(*Response())) {
    printLine(line);
  }
  for (const std::string& line : CookieLines(*Response())) {
    printLine(line);
  }
  for (const char* line : kFixedLines) {
    printLine(line);
  }
  printLine("");
}

void WebEntry::OutputBody() {
  // Names and texts of files may be of any bytes; JSON is UTF-8.
  print(RepairUtf8(JsonHelper::toString(Response()->GetBody())));
  if (fflush(stdout) != 0) {
    __fpurge(stdout);  // the client is gone, and no later flush must try again
  }
}

void RestartHttpd(void*) {
  const qelow3::Engine engine;
  qelow3::ARDO(engine).RestartService();
}

}  // namespace QELO
