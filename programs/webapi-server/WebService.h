#pragma once

#include <sys/types.h>

#include <string>

#include "programs/server/Service.h"
#include "programs/server/metrics/Metrics.h"

namespace QELO {

class WorkerHub;

/// Serves the requests that a web server passes on by SCGI, each as a CGI program that was just
/// started would: with the request's variables as its whole environment, the body on standard input
/// and the answer on standard output. Addresses of methods are served, too.
class WebService : public Service {
 public:
  /// Who may connect beside root and our own account; (uid_t)-1: nobody.
  struct Peers {
    uid_t client = static_cast<uid_t>(-1);  ///< passes requests on
    uid_t reader = static_cast<uid_t>(-1);  ///< reads the figures
    std::string figures;                    ///< path of the socket that they are read by
  };

  /// @param argc, argv  main()'s, whose area shows the call that a process serves
  WebService(const Peers& peers, const Metrics& metrics, int argc, char** argv)
      : peers_(peers), metrics_(metrics), argc_(argc), argv_(argv) {}

  /// Loads the API libraries that the descriptions of the working directory name.
  static void LoadLibraries();

  /// Has them read their descriptions anew when the server reloads. @param workers  may be null
  void Use(WorkerHub* workers) { workers_ = workers; }

  bool Admits(const Connection& connection) override;
  Arrival Take(Connection& connection) override;
  bool UsesNotes() const override { return false; }
  int Serve(Connection& connection, Note& note) override;
  std::string Refuse(Refusal reason) override;
  void Ended(const Note& note, const End& end) override;
  void Reload(Server& server) override;

 private:
  bool IsReading(const Connection& connection) const;

  const Peers peers_;
  const Metrics& metrics_;
  const int argc_;
  char** const argv_;
  WorkerHub* workers_ = nullptr;
  ServerClock::time_point nextLook_;  ///< at the libraries' files
};

}  // namespace QELO
