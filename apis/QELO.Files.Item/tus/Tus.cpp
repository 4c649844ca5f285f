// Uploads that go on where they were broken off: tus 1.0, the open protocol that stock clients
// speak.

#include "calls/Methods.h"
#include "tus/Exchange.h"

namespace files {

void tus(QELO::APIRequest* request, QELO::APIResponse* response) {
  Exchange(request, response).Serve();
}

}  // namespace files
