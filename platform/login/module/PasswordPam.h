#pragma once

/// Checks a password and the account with PAM, service "webapi".
/// @param configuration  directory to read the service from; null: the host's own
/// @param address        the client's, which modules of PAM log and judge; "" when it is not known
/// @param user           receives the account's name as PAM has it
/// @return 1 right; 0 refused; 2 the password is right and the account refused; a negative value
/// when PAM cannot check: -1 to -(PAM's error + 1)
using PasswordPamCheck = int (*)(const char* configuration, const char* account,
                                 const char* password, const char* address, char* user, int size);

inline constexpr char kPasswordPamModule[] = "password_pam.so";
inline constexpr char kPasswordPamCheck[] = "webapiPamCheck";
