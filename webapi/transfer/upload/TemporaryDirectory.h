#pragma once

#include <string>

namespace QELO {

/// Chooses where the temporary files of an upload go: on a volume, unless the host is of the kind
/// that has none to spare; else "/tmp", else "/var/tmp".
/// @param size       bytes that must be free there
/// @param directory  receives the directory; unchanged when there is none
/// @return whether there is one. Each place without room sets the platform's error 10496, a
/// "/var/tmp"
///         that cannot be made 3072
bool ChooseTemporaryDirectory(unsigned long long size, std::string& directory);

}  // namespace QELO
