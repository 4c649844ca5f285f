#pragma once

#include <string>

namespace serverstatus {

enum class Outcome {
  kRead,
  kNobody,  ///< nobody listens there
  kFailed   ///< somebody does, and gave no page in time
};

/// Reads a page of an HTTP server that listens at a local socket. Waits two seconds for each piece,
/// and takes 64 KiB at most.
/// @param page  receives the body; what it holds otherwise means nothing
Outcome ReadPage(const std::string& socket, const std::string& path, std::string& page);

}  // namespace serverstatus
