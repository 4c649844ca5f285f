#pragma once

#include "platform/accounts/AccountDatabase.h"
#include "platform/settings/Settings.h"

namespace QELO::Platform {

/// Whether the account is of the group that the setting "admin_group" names.
/// @return 1 or 0, -1 when that cannot be told
int isAdministrator(const Settings& settings, const Account& account);

/// The account that methods run as when their description names no other.
inline constexpr char kWorkingAccount[] = "system";

/// Accounts that nobody logs in to, whatever the password: "system", and those without a shell.
bool isBarredFromLogin(const Account& account);

/// Whether what an account was given before, a session or a token, may still be used.
enum class Usability {
  kGood,
  kBarred,  ///< nobody logs in to it
  kLocked,  ///< by its administrator
  kExpired,
  kUnknown  ///< the account database cannot be read
};

/// What the host's own files say. A password that must be changed keeps from logging in alone.
Usability usabilityOf(const Account& account);
/// "locked" for kLocked, and so on, for messages.
const char* usabilityName(Usability usability);

}  // namespace QELO::Platform
