#pragma once

#include <sys/types.h>

#include <string>

#include "programs/server/Service.h"

namespace QELO {

/// Serves the requests that a web server passes on by SCGI, each as a CGI program that was just
/// started would: with the request's variables as its whole environment, the body on standard input
/// and the answer on standard output.
class WebService : public Service {
 public:
  /// @param client      the account that may connect beside root and our own; (uid_t)-1: none
  /// @param argc, argv  main()'s, whose area shows the call that a process serves
  WebService(uid_t client, int argc, char** argv) : client_(client), argc_(argc), argv_(argv) {}

  /// Loads the API libraries that the descriptions of the working directory name.
  static void LoadLibraries();

  bool Admits(const Connection& connection) override;
  Arrival Take(Connection& connection) override;
  int Serve(Connection& connection, Note& note) override;
  std::string Refuse(Refusal reason) override;
  void Ended(const Note& note, const End& end) override;
  void Reload(Server& server) override;

 private:
  const uid_t client_;
  const int argc_;
  char** const argv_;
  ServerClock::time_point nextLook_;  ///< at the libraries' files
};

}  // namespace QELO
