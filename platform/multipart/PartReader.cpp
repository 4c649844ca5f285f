#include "platform/multipart/PartReader.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "platform/multipart/Limits.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

constexpr std::string_view kLineEnd = "\r\n";
constexpr std::string_view kHeaderEnd = "\r\n\r\n";

}  // namespace

// The body's first boundary may stand at its very beginning, without a line end before it. One that
// is put there makes it like all others.
PartReader::PartReader(const std::string& boundary, Source source, size_t bufferSize)
    : mark_(std::string(kLineEnd) + "--" + boundary),
      source_(std::move(source)),
      size_(bufferSize),
      buffer_(std::make_unique_for_overwrite<char[]>(bufferSize)),
      end_(kLineEnd.copy(buffer_.get(), kLineEnd.size())) {}

/// What stands at a place that begins with the mark.
/// @param length  receives the bytes of the whole boundary line
PartReader::Mark PartReader::MarkAt(size_t at, size_t& length) const {
  const std::string_view rest(buffer_.get() + at, end_ - at);
  const std::string_view behind = rest.substr(mark_.size());
  if (behind.starts_with("--")) {
    length = mark_.size() + 2;
    return Mark::kEnd;
  }
  const size_t blanks = std::min(behind.find_first_not_of(" \t"), behind.size());
  if (blanks > UploadLimits::kPadding) {
    return Mark::kNone;
  }
  const std::string_view lineEnd = behind.substr(blanks, kLineEnd.size());
  length = mark_.size() + blanks + kLineEnd.size();
  if (lineEnd == kLineEnd) {
    return Mark::kPart;
  }
  const bool mayGoOn = lineEnd.empty() || lineEnd == "\r" || behind == "-";
  return mayGoOn ? Mark::kCut : Mark::kNone;
}

int PartReader::Fill() {
  if (begin_ > 0) {
    memmove(buffer_.get(), buffer_.get() + begin_, end_ - begin_);
    end_ -= begin_;
    begin_ = 0;
  }
  const int64_t count = source_(buffer_.get() + end_, size_ - end_);
  if (count <= 0) {
    return count == 0 ? QELO_UPLOAD_MALFORMED : static_cast<int>(count);
  }
  end_ += static_cast<size_t>(count);
  received_ += static_cast<uint64_t>(count);
  return 0;
}

int PartReader::PassOn(size_t end, const Sink& sink) {
  const std::string_view bytes(buffer_.get() + begin_, end - begin_);
  begin_ = end;
  return bytes.empty() ? 0 : sink(bytes);
}

/// Passes on all up to the next boundary line, and takes that. What only begins like one is
/// content.
int PartReader::ReadMark(const Sink& sink) {
  for (size_t from = begin_;;) {
    const void* found = memmem(buffer_.get() + from, end_ - from, mark_.data(), mark_.size());
    size_t next = 0;  // up to where there is nothing but content
    if (found != nullptr) {
      next = Offset(found);
      size_t length = 0;
      const Mark mark = MarkAt(next, length);
      if (mark == Mark::kNone) {
        from = next + mark_.size();
        continue;
      }
      if (mark != Mark::kCut) {
        const int fault = PassOn(next, sink);
        isOver_ = mark == Mark::kEnd;
        begin_ = next + length;
        return fault;
      }
    } else {
      // What may be the front of a mark is kept until more has come.
      const size_t tail = std::max(from, end_ - std::min(end_, mark_.size() - 1));
      const void* front = memchr(buffer_.get() + tail, '\r', end_ - tail);
      next = front == nullptr ? end_ : Offset(front);
    }
    int fault = PassOn(next, sink);
    fault = fault == 0 ? Fill() : fault;
    if (fault != 0) {
      return fault;
    }
    from = begin_;
  }
}

int PartReader::Next(PartHeader& header, bool& isEnd) {
  if (!isStarted_) {
    size_t preamble = 0;
    const int fault = ReadMark([&](std::string_view bytes) {
      preamble += bytes.size();
      return preamble <= UploadLimits::kPreamble + kLineEnd.size() ? 0 : QELO_UPLOAD_TOO_LARGE;
    });
    if (fault != 0) {
      return fault;
    }
    isStarted_ = true;
  }
  isEnd = isOver_;
  if (isOver_) {
    return 0;
  }
  size_t end = Held().find(kHeaderEnd);
  while (end == std::string_view::npos) {
    if (Held().size() >= UploadLimits::kHeader + kHeaderEnd.size()) {
      return QELO_UPLOAD_TOO_LARGE;
    }
    if (const int fault = Fill(); fault != 0) {
      return fault;
    }
    end = Held().find(kHeaderEnd);
  }
  if (end > UploadLimits::kHeader) {
    return QELO_UPLOAD_TOO_LARGE;
  }
  const int fault = readPartHeader(Held().substr(0, end), header);
  // The second line end stays: a part without content may have none but this before its boundary.
  begin_ += end + kLineEnd.size();
  return fault;
}

int PartReader::ReadContent(const Sink& sink) {
  while (Held().size() < mark_.size() && std::string_view(mark_).starts_with(Held())) {
    if (const int fault = Fill(); fault != 0) {
      return fault;
    }
  }
  if (!Held().starts_with(mark_)) {
    begin_ += kLineEnd.size();
    return ReadMark(sink);
  }
  size_t lineEndLeft = kLineEnd.size();  // that of the header, if this is no boundary after all
  return ReadMark([&](std::string_view bytes) {
    const size_t off = std::min(lineEndLeft, bytes.size());
    lineEndLeft -= off;
    return bytes.size() == off ? 0 : sink(bytes.substr(off));
  });
}

}  // namespace QELO::Platform
