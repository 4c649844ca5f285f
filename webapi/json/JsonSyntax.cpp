#include "webapi/json/JsonSyntax.h"

namespace QELO::JsonHelper {
namespace {

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

bool isHexDigit(char c) {
  return isDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

/// Recursive descent over the text; each step takes what it is named for off the front.
class SyntaxChecker {
 public:
  SyntaxChecker(std::string_view text, bool comments, int maxDepth)
      : rest_(text), comments_(comments), depthLeft_(maxDepth) {}

  bool Text() {
    if (comments_) {
      Word(kByteOrderMark);
    }
    return Value() && rest_.empty();
  }

 private:
  bool Value() {
    Blanks();
    const bool good = Bare();
    Blanks();
    return good;
  }

  /// A value without the blanks around it; its first character says of which kind.
  bool Bare() {
    switch (rest_.empty() ? '\0' : rest_.front()) {
      case '{':
        return Container('}', &SyntaxChecker::Member);
      case '[':
        return Container(']', &SyntaxChecker::Value);
      case '"':
        return String();
      case 't':
        return Word("true");
      case 'f':
        return Word("false");
      case 'n':
        return Word("null");
      default:
        return Number();
    }
  }

  bool Container(char close, bool (SyntaxChecker::*item)()) {
    if (depthLeft_ == 0) {
      return false;
    }
    --depthLeft_;
    rest_.remove_prefix(1);
    Blanks();
    bool good = Character(close);
    if (!good) {
      do {
        good = (this->*item)();
      } while (good && Character(','));
      good = good && Character(close);
    }
    ++depthLeft_;
    return good;
  }

  bool Member() {
    Blanks();
    if (!String()) {
      return false;
    }
    Blanks();
    return Character(':') && Value();
  }

  bool String() {
    if (!Character('"')) {
      return false;
    }
    while (!rest_.empty()) {
      const char c = rest_.front();
      rest_.remove_prefix(1);
      if (c == '"') {
        return true;
      }
      if (static_cast<unsigned char>(c) < ' ' || (c == '\\' && !Escape())) {
        return false;
      }
    }
    return false;
  }

  bool Escape() {
    constexpr std::string_view kSimple = "\"\\/bfnrt";
    if (rest_.empty()) {
      return false;
    }
    const char c = rest_.front();
    rest_.remove_prefix(1);
    if (c != 'u') {
      return kSimple.find(c) != std::string_view::npos;
    }
    for (int i = 0; i < 4; ++i) {
      if (rest_.empty() || !isHexDigit(rest_.front())) {
        return false;
      }
      rest_.remove_prefix(1);
    }
    return true;
  }

  bool Number() {
    Character('-');
    if (!Character('0') && !Digits()) {
      return false;
    }
    if (Character('.') && !Digits()) {
      return false;
    }
    if (Character('e') || Character('E')) {
      static_cast<void>(Character('+') || Character('-'));
      return Digits();
    }
    return true;
  }

  bool Digits() {
    const size_t before = rest_.size();
    while (!rest_.empty() && isDigit(rest_.front())) {
      rest_.remove_prefix(1);
    }
    return rest_.size() < before;
  }

  void Blanks() {
    do {
      const size_t end = rest_.find_first_not_of(" \t\r\n");
      rest_.remove_prefix(end != std::string_view::npos ? end : rest_.size());
    } while (comments_ && (Comment("//", "\n") || Comment("/*", "*/")));
  }

  bool Comment(std::string_view open, std::string_view close) {
    if (!rest_.starts_with(open)) {
      return false;
    }
    const size_t end = rest_.find(close, open.size());
    if (end == std::string_view::npos) {
      // A line comment may end with the text; the other kind left open is no comment.
      const bool line = close == "\n";
      rest_.remove_prefix(line ? rest_.size() : 0);
      return line;
    }
    rest_.remove_prefix(end + close.size());
    return true;
  }

  bool Word(std::string_view word) {
    const bool found = rest_.starts_with(word);
    rest_.remove_prefix(found ? word.size() : 0);
    return found;
  }

  bool Character(char c) {
    const bool found = !rest_.empty() && rest_.front() == c;
    rest_.remove_prefix(found ? 1 : 0);
    return found;
  }

  std::string_view rest_;
  bool comments_;
  int depthLeft_;
};

}  // namespace

bool isJsonText(std::string_view text, bool comments, int maxDepth) {
  return SyntaxChecker(text, comments, maxDepth).Text();
}

}  // namespace QELO::JsonHelper
