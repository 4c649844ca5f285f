// The web entry's output: header lines and body on standard output, and the restart of the web
// server that may follow.

#include "webapi/WebEntry.h"
#include "webapi/entry/output/AnswerText.h"
#include "webapi/entry/output/WriteAnswer.h"
#include "webapi/platform/WebServer.h"

namespace QELO {

void WebEntry::OutputHeader() {
  WriteAnswer(HeaderText(*Response()));
}

void WebEntry::OutputBody() {
  WriteAnswer(BodyText(*Response()));
}

void RestartHttpd(void*) {
  const qelow3::Engine engine;
  qelow3::ARDO(engine).RestartService();
}

}  // namespace QELO
