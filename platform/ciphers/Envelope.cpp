#include "platform/ciphers/Envelope.h"

#include <json/json.h>

#include <array>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/base/Text.h"

namespace QELO::Platform {
namespace {

constexpr size_t kLongestHeader = 256;  // characters
constexpr size_t kLongestKey = 1024;    // characters: of an RSA key of 6,144 bits
constexpr size_t kIvSize = 16;
constexpr size_t kTagSize = 32;
constexpr size_t kBlockSize = 16;
constexpr size_t kMembers = 3;
constexpr char kContentCipher[] = "A256CBC-HS512";

int digit(char c) {
  if (c >= 'A' && c <= 'Z') {
    return c - 'A';
  }
  if (c >= 'a' && c <= 'z') {
    return c - 'a' + 26;
  }
  if (c >= '0' && c <= '9') {
    return c - '0' + 52;
  }
  return c == '-' ? 62 : c == '_' ? 63 : -1;
}

/// Base64url without padding; bits that no byte takes have to be 0.
bool decode(std::string_view text, std::string& bytes) {
  unsigned bits = 0;
  unsigned count = 0;
  bytes.clear();
  bytes.reserve(text.size() * 3 / 4);
  for (const char c : text) {
    const int value = digit(c);
    if (value < 0) {
      return false;
    }
    bits = (bits << 6U | static_cast<unsigned>(value)) & 0xffffU;
    count += 6;
    if (count >= 8) {
      count -= 8;
      bytes += static_cast<char>(bits >> count & 0xffU);
    }
  }
  return count < 6 && (bits & ((1U << count) - 1)) == 0;
}

bool readHeader(std::string_view text, Envelope& envelope) {
  std::string decoded;
  Json::Value header;
  if (text.size() > kLongestHeader || !decode(text, decoded) ||
      !JsonHelper::fromString(decoded, header) || !header.isObject() || header.size() != kMembers) {
    return false;
  }
  const Json::Value& made = JsonHelper::member(header, "iat");
  envelope.algorithm = JsonHelper::asString(JsonHelper::member(header, "alg"));
  envelope.made = JsonHelper::asInt64(made, 0);
  envelope.parts.header = text;
  return JsonHelper::isText(JsonHelper::member(header, "enc"), kContentCipher) && made.isIntegral();
}

}  // namespace

bool readEnvelope(std::string_view text, Envelope& envelope) {
  std::array<std::string_view, 5> parts;
  for (size_t i = 0; i < parts.size(); ++i) {
    const size_t end = text.find('.');
    if ((end == std::string_view::npos) != (i + 1 == parts.size())) {
      return false;
    }
    parts[i] = text.substr(0, end);
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
  }
  Envelope read;
  if (parts[1].size() > kLongestKey || !readHeader(parts[0], read) ||
      !decode(parts[1], read.parts.key) || !decode(parts[2], read.parts.iv) ||
      !decode(parts[3], read.parts.text) || !decode(parts[4], read.parts.tag) ||
      read.parts.iv.size() != kIvSize || read.parts.tag.size() != kTagSize ||
      read.parts.text.empty() || read.parts.text.size() % kBlockSize != 0) {
    return false;
  }
  envelope = std::move(read);
  return true;
}

}  // namespace QELO::Platform
