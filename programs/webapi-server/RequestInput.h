#pragma once

#include <chrono>
#include <cstdint>

namespace QELO {

/// Makes a request's body the process's standard input, as a web server gives it to a CGI program:
/// a pipe that ends where the body does, whatever the connection does then. What a pipe holds is
/// put into it; for more there is a process that passes it on, which ends with the body, with the
/// pipe's reader, or when the client sends nothing for long.
/// @param connection  the socket, with the body next
/// @param length      the body's bytes; 0: standard input stays as it is
/// @return false, with errno, when that cannot be had
bool PutBodyOnInput(int connection, int64_t length);

}  // namespace QELO
