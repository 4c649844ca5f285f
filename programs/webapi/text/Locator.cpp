#include "programs/webapi/text/Locator.h"

#include <set>

#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

/// Walks over a text and its value side by side. The text is JSON, which its reader has made sure
/// of, nesting within its limit included; so nothing is refused here, and the end ends everything.
class Locator {
 public:
  explicit Locator(std::string_view text) : text_(text) {
    if (text_.starts_with("\xEF\xBB\xBF")) {
      at_ = 3;  // a byte order mark
    }
  }

  void Value(Json::Value* value) {
    Blanks();
    if (value != nullptr) {
      value->setOffsetStart(static_cast<ptrdiff_t>(at_));
    }
    switch (Next()) {
      case '{':
        return Object(value);
      case '[':
        return Array(value);
      case '"':
        String();
        return;
      default:
        at_ = std::min(text_.find_first_of(" \t\r\n,]}/", at_), text_.size());
    }
  }

  std::vector<Twice> twice;

 private:
  char Next() const { return at_ < text_.size() ? text_[at_] : '\0'; }

  bool Take(char c) {
    Blanks();
    const bool isThere = Next() == c && at_ < text_.size();
    at_ += isThere ? 1 : 0;
    return isThere;
  }

  /// Goes over blanks and comments.
  void Blanks() {
    while (at_ < text_.size()) {
      const std::string_view rest = text_.substr(at_);
      size_t length = rest.find_first_not_of(" \t\r\n");
      if (rest.starts_with("//")) {
        length = rest.find('\n');
      } else if (rest.starts_with("/*")) {
        length = rest.find("*/", 2);
        length += length == std::string_view::npos ? 0 : 2;
      }
      if (length == 0) {
        return;
      }
      at_ = length == std::string_view::npos ? text_.size() : at_ + length;
    }
  }

  std::string String() {
    const size_t start = at_;
    for (++at_; at_ < text_.size() && text_[at_] != '"'; ++at_) {
      at_ += text_[at_] == '\\' ? 1 : 0;
    }
    at_ = std::min(at_ + 1, text_.size());
    Json::Value name;
    JsonHelper::fromString(std::string(text_.substr(start, at_ - start)), name);
    return JsonHelper::asString(name);
  }

  void Object(Json::Value* value) {
    std::set<std::string> seen;
    ++at_;
    while (at_ < text_.size() && !Take('}')) {
      const size_t start = at_;
      const std::string name = String();
      Take(':');
      Json::Value* member = nullptr;
      if (value != nullptr && JsonHelper::hasMember(*value, name)) {
        member = &(*value)[name];
      }
      if (!seen.insert(name).second) {
        twice.push_back({start, name});
      }
      Value(member);
      if (member != nullptr) {
        member->setOffsetLimit(static_cast<ptrdiff_t>(start));
      }
      Take(',');
      Blanks();
    }
  }

  void Array(Json::Value* value) {
    ++at_;
    for (Json::ArrayIndex i = 0; at_ < text_.size() && !Take(']'); ++i) {
      const bool isThere = value != nullptr && value->isArray() && i < value->size();
      Value(isThere ? &(*value)[i] : nullptr);
      Take(',');
      Blanks();
    }
  }

  std::string_view text_;
  size_t at_ = 0;
};

}  // namespace

std::vector<Twice> Locate(std::string_view text, Json::Value& root) {
  Locator locator(text);
  locator.Value(&root);
  return std::move(locator.twice);
}

}  // namespace QELO::AuthorProgram
