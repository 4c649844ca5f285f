#include <time.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>

#include "platform/base/ModuleLoader.h"
#include "platform/base/Paths.h"
#include "platform/base/TextBuffer.h"
#include "platform/ciphers/Envelope.h"
#include "platform/ciphers/ReplayTable.h"
#include "platform/settings/Settings.h"
#include "webapi/base/Log.h"
#include "webapi/base/OwnFile.h"
#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::Platform {
namespace {

constexpr char kSource[] = "Ciphers.cpp";
constexpr char kName[] = "__cIpHeRtExT";
constexpr char kForPrivateKey[] = "RSA-OAEP-256";
constexpr char kForKeyText[] = "dir";
constexpr size_t kLargestKeyFile = 16384;  // bytes
constexpr char kNoPrivateKey[] = "the private key is missing, or others may read or write it";

/// Logged for the administrator alone: who sent it learns that it failed and no more.
bool refuse(const char* reason) {
  WEBAPI_LOG(kSource, "no envelope was opened: %s", LogText(reason).c_str());
  return false;
}

int refuseKey(const char* reason) {
  WEBAPI_LOG(kSource, "no public key was given out: %s", LogText(reason).c_str());
  return -1;
}

bool isName(std::string_view text) {
  return text == kName || (text.find('%') != std::string_view::npos &&
                           WebAPIUtil::URLDecode(std::string(text), true) == kName);
}

/// Whether the clocks of maker and host agree well enough.
bool isFresh(int64_t made, int64_t now, int64_t window) {
  return made >= now - window && made <= now + window;
}

/// Opens an envelope once within the time in which it may be opened.
/// @param open  called with the envelope and a place for what it holds
template <typename Open>
bool openOnce(std::string_view text, const char* algorithm, Open open, std::string& plain) {
  Envelope envelope;
  const int64_t now = time(nullptr);
  const int64_t window = Settings().GetNumber("cipher_window", 300, 10, 86400);
  if (!readEnvelope(text, envelope) || envelope.algorithm != algorithm) {
    return refuse("it has not the form of one");
  }
  if (!isFresh(envelope.made, now, window)) {
    return refuse("it is too old, or of the future");
  }
  std::string opened;
  if (!open(envelope.parts, opened)) {
    return refuse("it was changed, or made for another key");
  }
  if (opened.empty() || opened.find('\0') != std::string::npos) {
    return refuse("it holds no parameters");
  }
  if (!ReplayTable::Enter(envelope.parts.tag, now, envelope.made + window + 1)) {
    return refuse("it was opened before, or that cannot be told");
  }
  plain.swap(opened);
  return true;
}

bool readPrivateKey(std::string& pem) {
  UniqueFd file;
  struct stat info {};
  return OpenRegularFile(AT_FDCWD, Paths::kCipherKey, file, info) == 0 &&
         !OthersMayChange(Paths::kCipherKey) && (info.st_mode & (S_IRWXG | S_IRWXO)) == 0 &&
         ReadText(file.Get(), kLargestKeyFile, pem);
}

bool openForUs(std::string_view text, std::string& plain) {
  std::string pem;
  if (!readPrivateKey(pem)) {
    return refuse(kNoPrivateKey);
  }
  const auto open =
      reinterpret_cast<OpenByPrivateKey>(findInModule(kCipherModule, kOpenByPrivateKey));
  const bool opened = open != nullptr && openOnce(
                                             text, kForPrivateKey,
                                             [&](const CipherText& parts, std::string& found) {
                                               return open(pem, parts, &found);
                                             },
                                             plain);
  std::fill(pem.begin(), pem.end(), '\0');
  return opened;
}

/// Takes the pair with the envelope out of a line.
/// @return how many there were
int takeEnvelope(std::string_view line, std::string& others, std::string& envelope) {
  int count = 0;
  while (!line.empty()) {
    const std::string_view pair = TakePiece(line, "&");
    const size_t equals = std::min(pair.find('='), pair.size());
    if (!isName(pair.substr(0, equals))) {
      others += others.empty() ? "" : "&";
      others += pair;
    } else if (++count == 1) {
      envelope =
          WebAPIUtil::URLDecode(std::string(pair.substr(std::min(equals + 1, pair.size()))), true);
    }
  }
  return count;
}

/// Most lines have none, and are not taken apart.
bool mayHoldEnvelope(const char* line) {
  return strstr(line, kName) != nullptr || strchr(line, '%') != nullptr;
}

bool holdsEnvelope(std::string_view line) {
  while (!line.empty()) {
    const std::string_view pair = TakePiece(line, "&");
    if (isName(pair.substr(0, pair.find('=')))) {
      return true;
    }
  }
  return false;
}

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" {

int QeloCgiDetectAndDecryptParamLine(char* line) {
  if (line == nullptr) {
    return 0;
  }
  if (!mayHoldEnvelope(line) || !holdsEnvelope(line)) {
    return 1;
  }
  std::string whole;
  std::string envelope;
  std::string plain;
  const size_t room = strlen(line);
  if (takeEnvelope(line, whole, envelope) != 1) {
    refuse("there is more than one");
    return 0;
  }
  if (!openForUs(envelope, plain)) {
    return 0;
  }
  // Behind the others: of two of a name the last counts, and that is the one that nobody changed.
  whole += whole.empty() ? "" : "&";
  whole += plain;
  if (whole.size() > room) {
    return 0;
  }
  memcpy(line, whole.c_str(), whole.size() + 1);
  return 1;
}

int QeloCgiDecryptParam(char* text) {
  std::string plain;
  if (text == nullptr || !openForUs(text, plain) || plain.size() > strlen(text)) {
    return 0;
  }
  memcpy(text, plain.c_str(), plain.size() + 1);
  return 1;
}

int QeloCgiGetPublicKey(char* text, int size) {
  fillBuffer("", text, size);
  std::string pem;
  std::string found;
  if (!readPrivateKey(pem)) {
    return refuseKey(kNoPrivateKey);
  }
  const auto find = reinterpret_cast<FindPublicKey>(findInModule(kCipherModule, kFindPublicKey));
  const bool good = find != nullptr && find(pem, &found) && fillBuffer(found, text, size);
  std::fill(pem.begin(), pem.end(), '\0');
  return good ? 0 : refuseKey("the private key is of no use");
}

}  // extern "C"

bool QELO::CredRequestUtil::GetDecryptAESString(const std::string& key, const std::string& cipher,
                                                std::string& plain) {
  const auto open = reinterpret_cast<OpenByKeyText>(findInModule(kCipherModule, kOpenByKeyText));
  return open != nullptr &&
         openOnce(
             cipher, kForKeyText,
             [&](const CipherText& parts, std::string& found) { return open(key, parts, &found); },
             plain);
}
