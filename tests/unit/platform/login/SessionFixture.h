#pragma once

#include <json/json.h>
#include <signal.h>
#include <sys/resource.h>

#include <cstdlib>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Session.h"

/// Sessions in a private root.
class SessionFixture : public PrivateRoot {
 protected:
  struct Ticket {
    std::string id;
    std::string token;
  };

  static int TryCreate(const char* user, const char* address, Ticket* ticket = nullptr) {
    char id[QELO_SESSION_ID_LENGTH + 1] = "x";
    char token[QELO_SESSION_ID_LENGTH + 1] = "x";
    const int result = QeloSessionCreate(user, address, id, token);
    EXPECT_EQ(result == 0, id[0] != '\0');
    EXPECT_EQ(result == 0, token[0] != '\0');
    if (ticket != nullptr) {
      *ticket = {id, token};
    }
    return result;
  }

  static Ticket Create(const char* user = "alice", const char* address = kAddress) {
    Ticket ticket;
    EXPECT_EQ(TryCreate(user, address, &ticket), 0);
    return ticket;
  }

  /// The session's file, as a path below the root.
  static std::string File(const Ticket& ticket) { return "run/webapi/sessions/" + ticket.id; }

  static long SecondsLeft(const Ticket& ticket) {
    return QeloSessionSecondsLeft(ticket.id.c_str());
  }
};
