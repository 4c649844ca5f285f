#include "webapi/json/Reader.h"

#include <charconv>
#include <string>

#include "webapi/json/Literal.h"
#include "webapi/json/Number.h"

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
  Reader(std::string_view text, const Reading& how)
      : at_(text.data()),
        end_(text.data() + text.size()),
        how_(how),
        depthLeft_(how.maxDepth),
        valuesLeft_(how.maxValues) {}

  ReadResult Text(Json::Value& value) {
    if (how_.comments) {
      Word(kByteOrderMark);
    }
    if (Value(value) && at_ == end_) {
      return ReadResult::kRead;
    }
    return hasTooMany_ ? ReadResult::kTooMany : ReadResult::kNoJson;
  }

  /// How many bytes were not taken.
  size_t Left() const { return Rest().size(); }
  size_t Values() const { return how_.maxValues - valuesLeft_; }

 private:
  std::string_view Rest() const { return {at_, static_cast<size_t>(end_ - at_)}; }

  bool Value(Json::Value& value) {
    if (valuesLeft_ == 0) {
      hasTooMany_ = true;
      return false;
    }
    --valuesLeft_;
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

  bool Number(Json::Value& value) { return readNumber(at_, end_, how_.keepDigits, value); }

  void Blanks() {
    do {
      while (at_ != end_ && (*at_ == ' ' || *at_ == '\t' || *at_ == '\r' || *at_ == '\n')) {
        ++at_;
      }
    } while (how_.comments && at_ != end_ && *at_ == '/' &&
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
  const Reading& how_;
  int depthLeft_;
  size_t valuesLeft_;
  bool hasTooMany_ = false;
};

}  // namespace

ReadResult readJsonText(std::string_view text, const Reading& how, Json::Value& value,
                        size_t* values) {
  Reader reader(text, how);
  const ReadResult result = reader.Text(value);
  if (values != nullptr) {
    *values = reader.Values();
  }
  return result;
}

size_t jsonTextFault(std::string_view text, const Reading& how) {
  Reader reader(text, how);
  Json::Value value;
  return reader.Text(value) == ReadResult::kRead ? std::string_view::npos
                                                 : text.size() - reader.Left();
}

}  // namespace QELO::JsonHelper
