#pragma once

namespace QELO {

/// What a program that is set-user-id root does first, since its caller chose its environment and
/// its open descriptors.

/// Closes all descriptors but standard input, output and error.
void CloseInheritedDescriptors();

/// Leaves of the environment the CGI variables (RFC 3875 and what servers add), the request's
/// headers but "Proxy", which other programs take for a setting of theirs, what the library itself
/// reads, language and time zone, and what the setting "keep_environment" names. PATH is fixed.
void CleanEnvironment();

}  // namespace QELO
