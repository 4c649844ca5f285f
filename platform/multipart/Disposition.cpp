#include "platform/multipart/Disposition.h"

#include <strings.h>

#include <algorithm>
#include <optional>

#include "platform/multipart/Limits.h"
#include "webapi/base/Hex.h"
#include "webapi/base/Text.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

bool isSame(std::string_view left, std::string_view right) {
  return left.size() == right.size() && strncasecmp(left.data(), right.data(), left.size()) == 0;
}

/// Takes a quoted text off the front, its quotes and backslashes undone.
/// @param rest  starts behind the opening quote
/// @return false when there is no closing quote
bool takeQuoted(std::string_view& rest, std::string& text) {
  for (size_t at = 0; at < rest.size(); ++at) {
    if (rest[at] == '"') {
      rest.remove_prefix(at + 1);
      return true;
    }
    // Some send a path with single backslashes, which are no marks of anything.
    const bool isMark =
        rest[at] == '\\' && at + 1 < rest.size() && (rest[at + 1] == '"' || rest[at + 1] == '\\');
    at += isMark ? 1 : 0;
    text += rest[at];
  }
  return false;
}

/// Takes one "name=value" off the front of a header's parameters, which start with ";".
/// @return false when what stands there is none
bool takeParameter(std::string_view& rest, std::string_view& name, std::string& value) {
  rest.remove_prefix(1);
  const size_t equals = rest.find('=');
  if (equals == std::string_view::npos) {
    return false;
  }
  name = Trim(rest.substr(0, equals));
  rest.remove_prefix(equals + 1);
  rest.remove_prefix(std::min(rest.find_first_not_of(" \t"), rest.size()));
  value.clear();
  if (rest.starts_with('"')) {
    rest.remove_prefix(1);
    if (!takeQuoted(rest, value)) {
      return false;
    }
  } else {
    const size_t end = std::min(rest.find(';'), rest.size());
    value = Trim(rest.substr(0, end));
    rest.remove_prefix(end);
  }
  rest.remove_prefix(std::min(rest.find_first_not_of(" \t"), rest.size()));
  return (rest.empty() || rest.front() == ';') && !name.empty() &&
         name.find_first_of(";\"") == std::string_view::npos;
}

/// Undoes what browsers put for the three characters that a quoted name cannot hold. A "%" itself
/// they leave as it is, so nothing else is an escape.
std::string withoutEscapes(const std::string& name) {
  std::string plain;
  for (size_t at = 0; at < name.size(); ++at) {
    const std::string_view escape = std::string_view(name).substr(at, 3);
    const char byte = escape == "%22"         ? '"'
                      : isSame(escape, "%0D") ? '\r'
                      : isSame(escape, "%0A") ? '\n'
                                              : '\0';
    plain += byte == '\0' ? name[at] : byte;
    at += byte == '\0' ? 0 : 2;
  }
  return plain;
}

void appendLatin1(unsigned char byte, std::string& text) {
  if (byte < 0x80) {
    text += static_cast<char>(byte);
  } else {
    text += static_cast<char>(0xC0 | byte >> 6U);
    text += static_cast<char>(0x80 | (byte & 0x3FU));
  }
}

/// An extended value, as UTF-8''na%C3%AFve.txt. @return nothing when it is none
std::optional<std::string> extendedValue(std::string_view value) {
  const size_t language = value.find('\'');
  const size_t text =
      language == std::string_view::npos ? language : value.find('\'', language + 1);
  if (text == std::string_view::npos) {
    return std::nullopt;
  }
  const bool isLatin1 = isSame(value.substr(0, language), "ISO-8859-1");
  if (!isLatin1 && !isSame(value.substr(0, language), "UTF-8")) {
    return std::nullopt;
  }
  std::string plain;
  for (size_t at = text + 1; at < value.size(); ++at) {
    int byte = static_cast<unsigned char>(value[at]);
    if (byte == '%') {
      const int high = at + 2 < value.size() ? HexValue(value[at + 1]) : -1;
      const int low = at + 2 < value.size() ? HexValue(value[at + 2]) : -1;
      if (high < 0 || low < 0) {
        return std::nullopt;
      }
      byte = high * 16 + low;
      at += 2;
    }
    if (byte == 0) {
      return std::nullopt;
    }
    if (isLatin1) {
      appendLatin1(static_cast<unsigned char>(byte), plain);
    } else {
      plain += static_cast<char>(byte);
    }
  }
  return plain;
}

/// Without the folders that a client puts in front.
std::string lastPart(const std::string& path) {
  const size_t slash = path.find_last_of("/\\");
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

int readFileName(const std::string& sent, PartHeader& header) {
  if (sent.empty()) {  // a file field in which no file was chosen
    return 0;
  }
  header.fileName = lastPart(sent);
  if (header.fileName.empty() || header.fileName == "." || header.fileName == "..") {
    return QELO_UPLOAD_MALFORMED;
  }
  const bool fits = header.fileName.size() <= UploadLimits::kFileName &&
                    header.field.size() <= UploadLimits::kFileField;
  return fits ? 0 : QELO_UPLOAD_TOO_LARGE;
}

int readDisposition(std::string_view value, PartHeader& header) {
  const size_t end = std::min(value.find(';'), value.size());
  if (!isSame(Trim(value.substr(0, end)), "form-data")) {
    return QELO_UPLOAD_MALFORMED;
  }
  std::optional<std::string> fileName;
  std::optional<std::string> extended;
  std::string_view name;
  std::string text;
  for (std::string_view rest = value.substr(end); !rest.empty();) {
    if (Trim(rest) == ";") {
      break;
    }
    if (!takeParameter(rest, name, text)) {
      return QELO_UPLOAD_MALFORMED;
    }
    if (isSame(name, "name")) {
      header.field = withoutEscapes(text);
    } else if (isSame(name, "filename")) {
      fileName = withoutEscapes(text);
    } else if (isSame(name, "filename*")) {
      extended = extendedValue(text);
      if (!extended && !fileName) {
        fileName = "";
      }
    }
  }
  if (header.field.empty()) {
    return QELO_UPLOAD_MALFORMED;
  }
  if (header.field.size() > UploadLimits::kFieldName) {
    return QELO_UPLOAD_TOO_LARGE;
  }
  const std::optional<std::string>& sent = extended ? extended : fileName;
  return sent ? readFileName(*sent, header) : 0;
}

/// Whether a part's bytes stand for themselves.
bool isPlainEncoding(std::string_view encoding) {
  return isSame(encoding, "7bit") || isSame(encoding, "8bit") || isSame(encoding, "binary");
}

/// The lines of a header, those that go on in the next one as one.
int unfold(std::string_view text, std::string& lines) {
  size_t count = 0;
  while (!text.empty()) {
    const std::string_view line = TakePiece(text, "\r\n");
    const bool goesOn = line.starts_with(' ') || line.starts_with('\t');
    if (goesOn && lines.empty()) {
      return QELO_UPLOAD_MALFORMED;
    }
    if (++count > UploadLimits::kHeaderLines) {
      return QELO_UPLOAD_TOO_LARGE;
    }
    lines += lines.empty() || goesOn ? "" : "\n";
    lines += line;
  }
  return 0;
}

}  // namespace

std::string boundaryOf(std::string_view contentType) {
  std::string_view rest = contentType.substr(std::min(contentType.find(';'), contentType.size()));
  std::string_view name;
  std::string value;
  while (!rest.empty() && takeParameter(rest, name, value)) {
    if (!isSame(name, "boundary")) {
      continue;
    }
    const bool isGood =
        !value.empty() && value.size() <= UploadLimits::kBoundary && value.back() != ' ' &&
        std::all_of(value.begin(), value.end(), [](char c) { return c >= ' ' && c < 0x7F; });
    return isGood ? value : "";
  }
  return "";
}

int readPartHeader(std::string_view text, PartHeader& header) {
  header = PartHeader();
  header.text = text;
  std::string unfolded;
  if (text.find('\0') != std::string_view::npos) {
    return QELO_UPLOAD_MALFORMED;
  }
  if (const int fault = unfold(text, unfolded); fault != 0) {
    return fault;
  }
  for (std::string_view rest = unfolded; !rest.empty();) {
    const std::string_view line = TakePiece(rest, "\n");
    const size_t colon = line.find(':');
    if (colon == std::string_view::npos || line.find('\r') != std::string_view::npos) {
      return QELO_UPLOAD_MALFORMED;
    }
    const std::string_view name = line.substr(0, colon);
    const std::string_view value = Trim(line.substr(colon + 1));
    if (isSame(name, "Content-Disposition")) {
      const int fault =
          header.field.empty() ? readDisposition(value, header) : QELO_UPLOAD_MALFORMED;
      if (fault != 0) {
        return fault;
      }
    } else if (isSame(name, "Content-Transfer-Encoding") && !isPlainEncoding(value)) {
      return QELO_UPLOAD_MALFORMED;
    }
  }
  return header.field.empty() ? QELO_UPLOAD_MALFORMED : 0;
}

}  // namespace QELO::Platform
