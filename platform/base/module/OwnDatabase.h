#pragma once

#include <sqlite3.h>

#include <string>

namespace QELO::Platform {

/// Opens a database of ours for reading and writing. Whoever finds it in use waits `busyMs`
/// milliseconds; its companion files stay, else every process that comes and goes would make and
/// remove them.
/// @param database  receives the connection, to be closed after a failure too
/// @return false, with the reason, also where others may change the file or its directory
bool openOwnDatabase(const char* path, int busyMs, sqlite3*& database, std::string& error);

}  // namespace QELO::Platform
