#include "webapi/base/TakenBody.h"

namespace QELO {

int64_t& TakenBodyBytes() {
  static int64_t bytes = 0;
  return bytes;
}

}  // namespace QELO
