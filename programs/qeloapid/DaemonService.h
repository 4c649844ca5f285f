#pragma once

#include <string>

#include "programs/server/Service.h"

namespace QELO {

/// Serves the sockets that the descriptions of the working directory name: a message is one call,
/// which is made with the rights and the priority that the description asks for.
class DaemonService : public Service {
 public:
  /// @param argc, argv  main()'s, whose area shows the call that a process makes
  DaemonService(int argc, char** argv) : argc_(argc), argv_(argv) {}

  /// Listens where the descriptions say, and nowhere else. What cannot be had is logged, and tried
  /// again at the next reload.
  void Listen(Server& server);

  bool Admits(const Connection& connection) override;
  Arrival Take(Connection& connection) override;
  bool UsesNotes() const override { return true; }
  int Serve(Connection& connection, Note& note) override;
  std::string Refuse(Refusal reason) override;
  void Ended(const Note& note, const End& end) override;
  void Reload(Server& server) override;

 private:
  const int argc_;
  char** const argv_;
};

}  // namespace QELO
