// The CGI program: one process, one request.

#include "programs/entry/ServeRequest.h"

int main(int argc, char** argv) {
  return QELO::ServeRequest(argc, argv);
}
