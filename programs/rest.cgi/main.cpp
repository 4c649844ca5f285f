// The CGI program for clients that are made from a description: one process, one request.

#include "programs/entry.cgi/ServeRequest.h"
#include "programs/rest.cgi/RestEntry.h"

int main(int argc, char** argv) {
  return QELO::ServeRequest(argc, argv, QELO::RestEntry::Make);
}
