// The body of a request as it arrives, into the unfinished file.

#include <unistd.h>
#include <webapi/APIUpload.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <limits>
#include <memory>

#include "calls/Call.h"
#include "text/Base64.h"
#include "transfer/Digest.h"
#include "transfer/Library.h"
#include "tus/Exchange.h"

namespace files {
namespace {

constexpr size_t kPiece = 256 << 10;  ///< bytes that are read at once
constexpr char kMismatch[] = "460";   ///< the protocol's own status

/// @return 0 or errno
int writeAll(int file, const char* data, size_t size, uint64_t at) {
  while (size > 0) {
    const ssize_t count = TEMP_FAILURE_RETRY(pwrite(file, data, size, static_cast<off_t>(at)));
    if (count < 0) {
      return errno;
    }
    data += count;
    size -= static_cast<size_t>(count);
    at += static_cast<uint64_t>(count);
  }
  return 0;
}

/// The bytes of the request's body; without an end where the server does not know them.
uint64_t announcedLength(const std::string& header) {
  uint64_t length = std::numeric_limits<uint64_t>::max();
  std::from_chars(header.data(), header.data() + header.size(), length);
  return length;
}

/// Writes what comes behind the file's first `length` bytes, up to `end`.
/// @param left    bytes that come
/// @param isMore  whether the client sent more than up to the end
/// @return 0 or errno
int receive(int file, uint64_t end, uint64_t left, Digest* digest, uint64_t& length, bool& isMore) {
  const std::unique_ptr<char[]> buffer(new char[kPiece]);
  isMore = false;
  while (left > 0 && !isMore) {
    // One more than there may be shows whether there is more.
    const size_t room = std::min({uint64_t{kPiece}, end - length + 1, left});
    const long long count = QELO::APIUpload::ReadBody(buffer.get(), room);
    if (count <= 0) {
      break;  // what has come counts
    }
    const uint64_t taken = std::min(static_cast<uint64_t>(count), end - length);
    if (const int error = writeAll(file, buffer.get(), taken, length); error != 0) {
      return error;
    }
    if (digest != nullptr) {
      digest->Add(buffer.get(), taken);
    }
    length += taken;
    left -= static_cast<uint64_t>(count);
    isMore = static_cast<uint64_t>(count) > taken;
  }
  return 0;
}

}  // namespace

bool Exchange::Receive(const UploadState& state, const UploadData& data, uint64_t& length) {
  bool isMore = false;
  const uint64_t left = announcedLength(Header("CONTENT_LENGTH"));
  if (const int error = receive(data.Get(), state.length, left, nullptr, length, isMore);
      error != 0) {
    return Refuse(reasonOf(error), state.path.Text());
  }
  if (isMore) {
    return Refuse(Reason::kTooLarge, state.path.Text());
  }
  return true;
}

/// What was written counts when the checksum is that of the client, and not before, so that a
/// process that dies in the middle leaves nothing unchecked behind.
bool Exchange::ReceiveChecked(UploadState& state, const UploadData& data, uint64_t& length) {
  const std::string header = Header("HTTP_UPLOAD_CHECKSUM");
  const size_t blank = std::min(header.find(' '), header.size());
  std::string expected;
  const auto make = reinterpret_cast<MakeDigest>(
      findInLibrary(call_.LibraryDirectory(), kDigestLibrary, kMakeDigest));
  const std::unique_ptr<Digest> digest(make != nullptr ? make(header.substr(0, blank).c_str())
                                                       : nullptr);
  if (digest == nullptr || blank == header.size() ||
      !decodeBase64(std::string_view(header).substr(blank + 1), expected)) {
    Answer("400");
    return false;
  }
  state.checkedLength = static_cast<int64_t>(length);
  if (!store_.Save(id_, state)) {
    return Refuse(Reason::kFailed, state.path.Text());
  }
  bool isMore = false;
  const uint64_t left = announcedLength(Header("CONTENT_LENGTH"));
  const int error = receive(data.Get(), state.length, left, digest.get(), length, isMore);
  const bool isRight = error == 0 && !isMore && digest->Finish() == expected;
  if (!isRight) {
    if (!Settle(state, data)) {
      return false;
    }
    return error != 0 ? Refuse(reasonOf(error), state.path.Text())
                      : Refuse(isMore ? "413" : kMismatch,
                               isMore ? Reason::kTooLarge : Reason::kChanged, state.path.Text());
  }
  state.checkedLength = -1;
  return store_.Save(id_, state) || Refuse(Reason::kFailed, state.path.Text());
}

}  // namespace files
