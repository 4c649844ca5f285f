#pragma once

#include <sqlite3.h>

#include <string>

namespace QELO::Platform {

/// Milliseconds that one waits who finds a database of ours in use.
inline constexpr int kDatabasePatienceMs = 2000;

/// Opens a database of ours for reading and writing. Its companion files stay, else every process
/// that comes and goes would make and remove them; and closing it writes nothing, see
/// emptyDatabaseLog().
/// @param database  receives the connection, to be closed after a failure too
/// @return false, with the reason, also where others may change the file or its directory
bool openOwnDatabase(const char* path, sqlite3*& database, std::string& error);

/// Brings what was logged ahead into the database, unless others write: each process that opens it
/// would read the log anew. To be called by who has written.
void emptyDatabaseLog(sqlite3* database);
/// The same when it is closed, and only when nobody else has it open: for databases that many write
/// at once, each of whom would wait for the others' disk.
void emptyDatabaseLogAtClose(sqlite3* database);

}  // namespace QELO::Platform
