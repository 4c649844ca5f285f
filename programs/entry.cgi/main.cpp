// The CGI program: one process, one request.

#include "programs/entry.cgi/ServeRequest.h"

int main(int argc, char** argv) {
  return QELO::ServeRequest(argc, argv);
}
