#pragma once

#include <string>

/// What is removed when a signal ends the process: files that have a name. A web server ends a
/// program whose client has gone. Only a process that is killed (SIGKILL) leaves them.
namespace QELO::Platform::LastWords {

/// Has a file removed. Those beyond a fixed number are not.
/// @param directory  a descriptor, open as long as the file is here
void Add(int directory, const std::string& name);
/// Leaves the file alone from now on.
void Remove(int directory, const std::string& name);

}  // namespace QELO::Platform::LastWords
