#include "webapi/batch/pipe/AnswerPipe.h"

#include "webapi/Pipe.h"

namespace QELO {
namespace {

Pipe* own = nullptr;

}  // namespace

void takeAnswerPipe(Pipe& pipe) noexcept {
  if (own != nullptr) {
    own->Close();
  }
  own = &pipe;
}

bool isAnswerAwaited() noexcept {
  return own == nullptr || own->HasReader();
}

}  // namespace QELO
