#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>

#include "programs/server/Connection.h"
#include "programs/server/Note.h"

namespace QELO {

class Server;

/// What one server does with its connections.
class Service {
 public:
  enum class Arrival { kMore, kWhole, kAnswered, kMalformed, kTooLarge };
  enum class Refusal { kBusy, kSlow, kMalformed, kTooLarge, kTimedOut };

  /// How a serving process ended.
  struct End {
    pid_t pid;
    int status;                        ///< as waitpid(2) gives it
    bool isTimedOut;                   ///< it was killed for its time
    std::chrono::microseconds waited;  ///< before it was started
    std::chrono::microseconds lasted;
  };

  virtual ~Service() = default;

  /// Whether the other side may use the server at all; else it is hung up on.
  virtual bool Admits(const Connection& connection) = 0;
  /// Takes what has come of the header, without waiting and nothing of what follows it. kAnswered:
  /// no process is needed, the connection has the answer.
  virtual Arrival Take(Connection& connection) = 0;
  /// Whether Serve() tells anything by its note, which then is memory that both sides have.
  virtual bool UsesNotes() const = 0;
  /// Serves the request; in a process of its own, which has the connection alone and ends with
  /// this call's result. Without UsesNotes() the note is nobody's.
  virtual int Serve(Connection& connection, Note& note) = 0;
  /// What the other side is told in place of an answer; "" for nothing.
  virtual std::string Refuse(Refusal reason) = 0;
  /// A process has ended, which the server may log.
  virtual void Ended(const Note& note, const End& end) = 0;
  /// SIGHUP has come: takes new settings.
  virtual void Reload(Server& server) = 0;
};

}  // namespace QELO
