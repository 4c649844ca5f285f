// Calls a web API of this host from the command line.

#include "programs/webapi-exec/Program.h"

int main(int argc, char** argv) {
  return QELO::ExecProgram::run(argc, argv);
}
