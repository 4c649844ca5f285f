// A body of the type multipart/form-data, whatever it is: read as a whole and in pieces it is the
// same, and no more of it is handed out than came.
//
// An input's first byte says how long the pieces are, its second how the boundary is written; the
// rest is the body.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "platform/multipart/Disposition.h"
#include "platform/multipart/Limits.h"
#include "platform/multipart/PartReader.h"

namespace {

using namespace QELO::Platform;

constexpr size_t kBuffer = UploadLimits::kHeader + 512;

void require(bool isTrue, const char* what) {
  if (!isTrue) {
    fprintf(stderr, "wrong: %s\n", what);
    abort();
  }
}

/// All that a reader makes of a body, as one text.
std::string read(std::string_view body, const std::string& boundary, size_t piece) {
  size_t at = 0;
  PartReader reader(
      boundary,
      [&](char* into, size_t size) {
        const size_t count = std::min({size, piece, body.size() - at});
        memcpy(into, body.data() + at, count);
        at += count;
        return static_cast<int64_t>(count);
      },
      kBuffer);
  std::string made;
  PartHeader header;
  uint64_t handedOut = 0;
  uint64_t position = 0;
  int fault = 0;
  for (bool isEnd = false; (fault = reader.Next(header, isEnd)) == 0 && !isEnd;) {
    require(!header.field.empty(), "a part without a name");
    require(header.fileName.find_first_of("/\\") == std::string::npos, "a name with a folder");
    require(header.fileName.size() <= UploadLimits::kFileName, "a name beyond its limit");
    made += "[" + header.field + "|" + header.fileName + "]";
    fault = reader.ReadContent([&](std::string_view bytes) {
      require(!bytes.empty(), "nothing handed out");
      handedOut += bytes.size();
      made += bytes;
      return 0;
    });
    require(reader.Position() >= position && reader.Position() <= at, "a position that is none");
    position = reader.Position();
    if (fault != 0) {
      break;
    }
  }
  require(handedOut <= body.size(), "more handed out than came");
  return made + "=" + std::to_string(fault);
}

/// Up to the end of the content that was whole: of a part that breaks off, the pieces decide how
/// much of it is handed out.
std::string comparable(const std::string& made) {
  const size_t result = made.rfind('=');
  return made.substr(result) == "=0" ? made : made.substr(result);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size < 2) {
    return 0;
  }
  const size_t piece = data[0] == 0 ? 100000 : data[0];
  const std::string_view body(reinterpret_cast<const char*>(data + 2), size - 2);
  const char* types[] = {"multipart/form-data; boundary=B", "x;boundary=\"-- B\"",
                         "multipart/form-data; boundary=----WebKitFormBoundaryAb1"};
  const std::string boundary = boundaryOf(types[data[1] % 3]);
  const std::string whole = read(body, boundary, body.size() + 1);
  require(comparable(whole) == comparable(read(body, boundary, piece)), "pieces change the form");
  boundaryOf(body);
  PartHeader header;
  readPartHeader(body, header);
  return 0;
}
