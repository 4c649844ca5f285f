#pragma once

#include <string>
#include <string_view>

namespace QELO::Platform {

/// What the header of a form's part says.
struct PartHeader {
  std::string text;      ///< the header lines as they came
  std::string field;     ///< the field's name, not empty
  std::string fileName;  ///< what the client calls the file, without folders; "" when it is none
};

/// The boundary that a Content-Type names; "" when it names none that may be one.
std::string boundaryOf(std::string_view contentType);

/// Reads a part's header lines.
/// @param text  up to and without the empty line
/// @return 0, or a negative QeloUploadResult; `header` is then in pieces
///
/// Names in quotes are taken as browsers write them, where %22, %0D and %0A stand for a quote and
/// line ends, and as older programs do, with a backslash before a quote or a backslash. "filename*"
/// (RFC 8187, in UTF-8 or ISO-8859-1) counts before "filename".
int readPartHeader(std::string_view text, PartHeader& header);

}  // namespace QELO::Platform
