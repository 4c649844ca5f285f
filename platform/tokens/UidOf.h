#pragma once

#include <sys/types.h>

#include "platform/accounts/AccountDatabase.h"

namespace QELO::Platform {

/// The id of an account's user; -1 when there is none.
inline uid_t uidOf(const char* user) {
  Account account;
  return findAccount(user, account) == Lookup::kFound ? account.uid : static_cast<uid_t>(-1);
}

}  // namespace QELO::Platform
