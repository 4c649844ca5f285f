#pragma once

/// Checks a password against a hash of the shadow file.
/// @return 1 it is the password; 0 it is not; -1 the hash is of no scheme that is known here
using PasswordCryptVerify = int (*)(const char* hash, const char* password);

/// Hashes a password, with the host's own scheme and a fresh salt.
/// @param hash  receives the hash and a NUL
/// @return 0 on success
using PasswordCryptHash = int (*)(const char* password, char* hash, int size);

inline constexpr char kPasswordCryptModule[] = "password_crypt.so";
inline constexpr char kPasswordCryptVerify[] = "webapiPasswordVerify";
inline constexpr char kPasswordCryptHash[] = "webapiPasswordHash";
