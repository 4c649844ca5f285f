#include "platform/fileoutput/Answer.h"

#include "platform/base/Secrets.h"
#include "platform/fileoutput/FastRoad.h"
#include "platform/fileoutput/HttpDate.h"
#include "webapi/base/Number.h"
#include "webapi/platform/FileOutput.h"

namespace QELO::Platform {
namespace {

/// A page that somebody has uploaded runs no script and is of no origin: what it says is not done
/// in the name of who looks at it.
constexpr char kPolicy[] = "default-src 'none'; style-src 'unsafe-inline'; sandbox";
/// The type of what has none that could be sent.
constexpr char kUnknownType[] = "application/octet-stream";
/// Kept by the client alone, which asks each time whether it has changed.
constexpr char kCaching[] = "private, no-cache";

/// Whether the text ends no header line, so that nothing behind it becomes one.
bool isHeaderText(const std::string& text) {
  return !text.empty() && text.find_first_of(std::string_view("\r\n\0", 3)) == std::string::npos;
}

/// Whether the caller has asked for no other status than that of a content.
bool isContentsStatus(const std::string& status) {
  return status.empty() || status == "200" || status.starts_with("200 ");
}

std::string contentRange(const Range& range, off_t size) {
  return "bytes " + std::to_string(range.first) + "-" + std::to_string(range.last) + "/" +
         std::to_string(size);
}

}  // namespace

Answer::Answer(const Content& content, const std::vector<std::string>& lines,
               const std::string& type, const std::string& name)
    : content_(content),
      head_(lines),
      type_(isHeaderText(type) ? type : kUnknownType),
      wantsHeadAlone_(isMethod("HEAD")) {
  AddDefaults(name);
  AddValidators();
}

void Answer::AddDefaults(const std::string& name) {
  head_.Set("Content-Type", type_);
  head_.Set("X-Content-Type-Options", "nosniff");
  head_.SetDefault("Content-Security-Policy", kPolicy);
  head_.SetDefault("Content-Disposition",
                   HTTP::FileOutputerHelper::ContentDisposition(name, false));
  head_.SetDefault("Cache-Control", kCaching);
}

void Answer::AddValidators() {
  const Validators validators = content_.GetValidators();
  const std::string date = formatHttpDate(validators.modified);
  if (content_.IsFile()) {
    head_.SetDefault("ETag", validators.tag);
    if (!date.empty()) {
      head_.SetDefault("Last-Modified", date);
    }
  }
  head_.Set("Accept-Ranges", content_.IsFile() ? "bytes" : "none");
}

Validators Answer::GetValidators() const {
  Validators validators = content_.GetValidators();
  validators.tag = head_.Get("ETag");
  validators.modified = -1;
  parseHttpDate(head_.Get("Last-Modified"), validators.modified);
  return validators;
}

bool Answer::Send() {
  if (!isContentsStatus(head_.Get("Status"))) {
    return SendWhole(false);
  }
  const Validators validators = GetValidators();
  switch (checkConditions(validators)) {
    case Verdict::kFailed:
      return SendEmpty("412 Precondition Failed");
    case Verdict::kNotModified:
      return SendEmpty("304 Not Modified");
    case Verdict::kSend:
      break;
  }
  std::vector<Range> ranges;
  if (content_.IsFile() && isMethod("GET") && checkIfRange(validators)) {
    switch (readRanges(requestText("HTTP_RANGE"), content_.Length(), ranges)) {
      case Wanted::kNothing:
        return SendEmpty("416 Range Not Satisfiable");
      case Wanted::kRanges:
        return SendRanges(ranges);
      case Wanted::kWhole:
        break;
    }
  }
  return SendWhole(true);
}

bool Answer::SendEmpty(const char* status) {
  head_.Remove("Content-");
  head_.Set("Status", status);
  const std::string_view code = std::string_view(status).substr(0, 3);
  if (code == "416") {
    head_.Set("Content-Range", "bytes */" + std::to_string(content_.Length()));
  }
  if (code != "304") {
    head_.Set("Content-Type", "text/plain");
    head_.Set("Content-Length", "0");
  }
  return SendHead();
}

bool Answer::SendWhole(bool mayUseFastRoad) {
  if (!content_.IsFile()) {
    return SendStream();
  }
  if (mayUseFastRoad && FastRoad::Take(content_, head_)) {
    head_.Remove("Content-Length:");  // these two are the server's to say
    head_.Remove("Accept-Ranges:");
    return SendHead();
  }
  head_.Set("Content-Length", std::to_string(content_.Length()));
  return SendHead() && (wantsHeadAlone_ || SendPart(0, content_.Length()));
}

bool Answer::SendRanges(const std::vector<Range>& ranges) {
  head_.Set("Status", "206 Partial Content");
  if (ranges.size() > 1) {
    return SendParts(ranges);
  }
  const Range& range = ranges.front();
  head_.Set("Content-Range", contentRange(range, content_.Length()));
  head_.Set("Content-Length", std::to_string(range.Length()));
  return SendHead() && SendPart(range.first, range.Length());
}

bool Answer::SendParts(const std::vector<Range>& ranges) {
  const std::string boundary = makeSecret();  // no content holds it
  const std::string start = "--" + boundary + "\r\nContent-Type: " + type_ + "\r\nContent-Range: ";
  const std::string end = "--" + boundary + "--\r\n";
  std::vector<std::string> heads;
  off_t length = static_cast<off_t>(end.size());
  for (const Range& range : ranges) {
    heads.push_back(start + contentRange(range, content_.Length()) + "\r\n\r\n");
    length += static_cast<off_t>(heads.back().size()) + range.Length() + 2;  // the line end
  }
  head_.Set("Content-Type", "multipart/byteranges; boundary=" + boundary);
  head_.Set("Content-Length", std::to_string(length));
  if (!SendHead()) {
    return false;
  }
  for (size_t i = 0; i < ranges.size(); ++i) {
    if (!writer_.WriteText(heads[i]) || !SendPart(ranges[i].first, ranges[i].Length()) ||
        !writer_.WriteText("\r\n")) {
      return false;
    }
  }
  return writer_.WriteText(end);
}

bool Answer::SendStream() {
  off_t length = -1;
  if (!ParseNumber(head_.Get("Content-Length"), length) || length < 0) {
    length = -1;
    head_.Remove("Content-Length:");
  }
  return SendHead() && (wantsHeadAlone_ || writer_.SendStream(content_.Stream(), length));
}

bool Answer::SendPart(off_t first, off_t length) {
  return writer_.SendFile(content_.Descriptor(), content_.Start() + first, length);
}

bool Answer::SendHead() {
  return writer_.WriteText(head_.Text());
}

}  // namespace QELO::Platform
