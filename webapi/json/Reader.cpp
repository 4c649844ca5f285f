#include "webapi/json/Reader.h"

#include <charconv>
#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "webapi/json/Literal.h"

#include "webapi/base/Text.h"

namespace QELO::JsonHelper {
namespace {

/// Some editors put it before a file's text.
constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

/// Names in the texts that each call reads, descriptions and sessions. Those are not copied.
constexpr std::string_view kUsualNames[] = {
    "lib", "minVersion", "maxVersion", "methods", "authLevel", "allowUser",     "runAs",
    "1",   "user",       "address",    "token",   "created",   "requestFormat", "priority",
};

constexpr unsigned kHighSurrogate = 0xD800;
constexpr unsigned kLowSurrogate = 0xDC00;
constexpr unsigned kSurrogateEnd = 0xE000;

void appendUtf8(unsigned code, std::string& text) {
  const auto tail = [code](unsigned shift) {
    return static_cast<char>(0x80U | (code >> shift & 0x3FU));
  };
  if (code < 0x80) {
    text += static_cast<char>(code);
  } else if (code < 0x800) {
    text += {static_cast<char>(0xC0U | code >> 6U), tail(0)};
  } else if (code < 0x10000) {
    text += {static_cast<char>(0xE0U | code >> 12U), tail(6), tail(0)};
  } else {
    text += {static_cast<char>(0xF0U | code >> 18U), tail(12), tail(6), tail(0)};
  }
}

/// Recursive descent over the text; each step takes what it is named for off the front.
class Reader {
 public:
  Reader(std::string_view text, bool comments, int maxDepth)
      : at_(text.data()),
        end_(text.data() + text.size()),
        comments_(comments),
        depthLeft_(maxDepth) {}

  bool Text(Json::Value& value) {
    if (comments_) {
      Word(kByteOrderMark);
    }
    return Value(value) && at_ == end_;
  }

  /// How many bytes were not taken.
  size_t Left() const { return Rest().size(); }

 private:
  std::string_view Rest() const { return {at_, static_cast<size_t>(end_ - at_)}; }

  bool Value(Json::Value& value) {
    Blanks();
    const bool good = Bare(value);
    Blanks();
    return good;
  }

  /// A value without the blanks around it; its first character says of which kind.
  bool Bare(Json::Value& value) {
    switch (at_ == end_ ? '\0' : *at_) {
      case '{':
        return Nested(&Reader::Object, value);
      case '[':
        return Nested(&Reader::Array, value);
      case '"':
        return StringValue(value);
      case 't':
        value = Json::Value(true);
        return Word("true");
      case 'f':
        value = Json::Value(false);
        return Word("false");
      case 'n':
        value = Json::Value(Json::nullValue);
        return Word("null");
      default:
        return Number(value);
    }
  }

  bool Nested(bool (Reader::*container)(Json::Value&), Json::Value& value) {
    if (depthLeft_ == 0) {
      return false;
    }
    --depthLeft_;
    ++at_;
    Blanks();
    const bool good = (this->*container)(value);
    ++depthLeft_;
    return good;
  }

  bool Object(Json::Value& value) {
    value = Json::Value(Json::objectValue);
    if (Character('}')) {
      return true;
    }
    do {
      Blanks();
      std::string_view name;
      std::string changed;
      if (!String(name, changed)) {
        return false;
      }
      Blanks();
      if (!Character(':') || !Value(Member(value, name))) {
        return false;
      }
    } while (Character(','));
    return Character('}');
  }

  static Json::Value& Member(Json::Value& object, std::string_view name) {
    for (const std::string_view usual : kUsualNames) {
      if (usual == name) {
        return object[Literal(usual.data())];
      }
    }
    return *object.demand(name.data(), name.data() + name.size());
  }

  bool Array(Json::Value& value) {
    value = Json::Value(Json::arrayValue);
    if (Character(']')) {
      return true;
    }
    do {
      if (!Value(value.append(Json::Value(Json::nullValue)))) {
        return false;
      }
    } while (Character(','));
    return Character(']');
  }

  bool StringValue(Json::Value& value) {
    std::string_view text;
    std::string changed;
    if (!String(text, changed)) {
      return false;
    }
    value = Json::Value(text.data(), text.data() + text.size());
    return true;
  }

  /// @param text     receives the string: where it stands, or in `changed` when it has escapes
  bool String(std::string_view& text, std::string& changed) {
    if (!Character('"')) {
      return false;
    }
    text = Plain();
    while (Character('\\')) {
      changed.append(text);
      if (!Escape(changed)) {
        return false;
      }
      text = Plain();
    }
    if (!changed.empty()) {
      text = changed.append(text);
    }
    return Character('"');
  }

  /// The characters up to the next that ends a string or stands for another.
  std::string_view Plain() {
    const char* start = at_;
    while (at_ != end_ && *at_ != '"' && *at_ != '\\' && static_cast<unsigned char>(*at_) >= ' ') {
      ++at_;
    }
    return {start, static_cast<size_t>(at_ - start)};
  }

  bool Escape(std::string& text) {
    constexpr std::string_view kNames = "\"\\/bfnrt";
    constexpr std::string_view kMeanings = "\"\\/\b\f\n\r\t";
    if (Character('u')) {
      return CodePoint(text);
    }
    const size_t which = at_ != end_ ? kNames.find(*at_) : std::string_view::npos;
    if (which == std::string_view::npos) {
      return false;
    }
    ++at_;
    text += kMeanings[which];
    return true;
  }

  bool CodePoint(std::string& text) {
    unsigned code = 0;
    if (!CodeUnit(code)) {
      return false;
    }
    if (code >= kHighSurrogate && code < kSurrogateEnd) {
      unsigned low = 0;
      if (code >= kLowSurrogate || !Word("\\u") || !CodeUnit(low) || low < kLowSurrogate ||
          low >= kSurrogateEnd) {
        return false;
      }
      code = 0x10000U + ((code - kHighSurrogate) << 10U) + (low - kLowSurrogate);
    }
    appendUtf8(code, text);
    return true;
  }

  bool CodeUnit(unsigned& code) {
    constexpr int kDigits = 4;
    if (end_ - at_ < kDigits) {
      return false;
    }
    const char* last = at_ + kDigits;
    const auto result = std::from_chars(at_, last, code, 16);
    at_ = last;
    return result.ec == std::errc() && result.ptr == last;
  }

  bool Number(Json::Value& value) {
    const char* start = at_;
    Character('-');
    if (!Character('0') && !Digits()) {
      return false;
    }
    bool whole = true;
    if (Character('.')) {
      whole = false;
      if (!Digits()) {
        return false;
      }
    }
    if (Character('e') || Character('E')) {
      whole = false;
      static_cast<void>(Character('+') || Character('-'));
      if (!Digits()) {
        return false;
      }
    }
    return (whole && Integer(start, value)) || Real(start, value);
  }

  /// The number from `start` to here. @return false when it has more than 64 bits
  bool Integer(const char* start, Json::Value& value) const {
    int64_t number = 0;
    uint64_t large = 0;
    if (std::from_chars(start, at_, number).ec == std::errc() &&
        number <= std::numeric_limits<int32_t>::max()) {
      value = Json::Value(static_cast<Json::Int64>(number));
      return true;
    }
    if (*start != '-' && std::from_chars(start, at_, large).ec == std::errc()) {
      value = Json::Value(static_cast<Json::UInt64>(large));
      return true;
    }
    return false;
  }

  bool Real(const char* start, Json::Value& value) const {
    double number = 0;
    if (std::from_chars(start, at_, number).ec != std::errc()) {
      // Too small is as good as zero, too large is no number.
      number = std::strtod(std::string(start, at_).c_str(), nullptr);
    }
    value = Json::Value(number);
    return std::isfinite(number);
  }

  bool Digits() {
    const char* start = at_;
    while (at_ != end_ && IsDigit(*at_)) {
      ++at_;
    }
    return at_ != start;
  }

  void Blanks() {
    do {
      while (at_ != end_ && (*at_ == ' ' || *at_ == '\t' || *at_ == '\r' || *at_ == '\n')) {
        ++at_;
      }
    } while (comments_ && at_ != end_ && *at_ == '/' &&
             (Comment("//", "\n") || Comment("/*", "*/")));
  }

  bool Comment(std::string_view open, std::string_view close) {
    if (!Rest().starts_with(open)) {
      return false;
    }
    const size_t length = Rest().find(close, open.size());
    if (length == std::string_view::npos) {
      // A line comment may end with the text; the other kind left open is no comment.
      const bool line = close == "\n";
      at_ = line ? end_ : at_;
      return line;
    }
    at_ += length + close.size();
    return true;
  }

  bool Word(std::string_view word) {
    const bool found = Rest().starts_with(word);
    at_ += found ? word.size() : 0;
    return found;
  }

  bool Character(char c) {
    const bool found = at_ != end_ && *at_ == c;
    at_ += found ? 1 : 0;
    return found;
  }

  const char* at_;
  const char* end_;
  bool comments_;
  int depthLeft_;
};

}  // namespace

bool readJsonText(std::string_view text, bool comments, int maxDepth, Json::Value& value) {
  return Reader(text, comments, maxDepth).Text(value);
}

size_t jsonTextFault(std::string_view text, bool comments, int maxDepth) {
  Reader reader(text, comments, maxDepth);
  Json::Value value;
  return reader.Text(value) ? std::string_view::npos : text.size() - reader.Left();
}

}  // namespace QELO::JsonHelper
