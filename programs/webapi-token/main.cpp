// Makes, lists and revokes the access tokens that stand for a user in API calls.

#include "programs/webapi-token/Commands.h"

int main(int argc, char** argv) {
  const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
  return QELO::TokenProgram::run(arguments, stdout, stderr);
}
