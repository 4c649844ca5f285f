#pragma once

#include <memory>

namespace QELO {

class WebEntry;

/// Serves the one request that the process environment and standard input hold, to standard output,
/// as a CGI program does: takes nothing on trust from who started the process, stands in the
/// description directory, where the library looks API descriptions up, and ends the answer before
/// the API libraries are closed.
/// @param argc, argv  main()'s, whose area shows the call
/// @param make        makes the entry that serves it; null: a WebEntry
/// @return the process's exit status
int ServeRequest(int argc, char** argv, std::unique_ptr<WebEntry> (*make)() = nullptr);

}  // namespace QELO
