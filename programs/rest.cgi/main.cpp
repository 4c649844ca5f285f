// The CGI program for clients that are made from a description: one process, one request.

#include "programs/entry/RestEntry.h"
#include "programs/entry/ServeRequest.h"

int main(int argc, char** argv) {
  return QELO::ServeRequest(argc, argv, QELO::RestEntry::Make);
}
