#include "platform/relay/module/Transfer.h"

#include <poll.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>

namespace QELO::Platform {
namespace {

constexpr long kConnectTimeout = 10;            // seconds, the TLS handshake included
constexpr std::chrono::seconds kSendStall{60};  // without a byte of the request leaving
constexpr char kNoContinue[] = "Expect:";       // an answer of its own that CGI never gives

CredRequestError errorOf(CURLcode result) {
  switch (result) {
    case CURLE_OK:
      return CRED_REQUEST_OK;
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_CONNECT:
      return CRED_REQUEST_UNREACHABLE;
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_SSL_CACERT_BADFILE:
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
    case CURLE_SSL_CERTPROBLEM:
    case CURLE_SSL_ISSUER_ERROR:
      return CRED_REQUEST_UNTRUSTED;
    case CURLE_OPERATION_TIMEDOUT:
      return CRED_REQUEST_TIMEOUT;
    case CURLE_WRITE_ERROR:
      return CRED_REQUEST_ANSWER_LENGTH;
    case CURLE_ABORTED_BY_CALLBACK:
      return CRED_REQUEST_BAD_BODY;
    default:
      return CRED_REQUEST_BROKEN;
  }
}

/// Web servers answer for themselves in other types than methods do.
bool isMethodsAnswer(long status, const char* type) {
  const auto begins = [type](const char* start) {
    return type != nullptr && strncasecmp(type, start, strlen(start)) == 0;
  };
  return (status >= 200 && status < 300) || begins("application/json") || begins("text/plain");
}

}  // namespace

bool Transfer::Prepare() {
  handle_.reset(curl_easy_init());
  if (handle_ == nullptr || !SetHeaders() || !SetSecurity() || !SetOptions()) {
    Fail(CRED_REQUEST_NO_TRANSPORT, "the transport takes no request");
    return false;
  }
  return true;
}

bool Transfer::AddHeader(const char* header) {
  curl_slist* longer = curl_slist_append(headers_.get(), header);
  if (longer == nullptr) {
    return false;  // what there was is there yet
  }
  [[maybe_unused]] const curl_slist* before = headers_.release();
  headers_.reset(longer);
  return true;
}

/// All or none: without one of them the other host would take the call for another one.
bool Transfer::SetHeaders() {
  return std::all_of(call_.headers.begin(), call_.headers.end(),
                     [this](const std::string& header) { return AddHeader(header.c_str()); }) &&
         AddHeader(kNoContinue);
}

/// Each of these has to be taken: without one of them the call would go out unguarded.
bool Transfer::SetSecurity() {
  CURL* curl = handle_.get();
  return curl_easy_setopt(curl, CURLOPT_PROTOCOLS_STR, "https") == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_FOLLOWLOCATION, 0L) == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_PROXY, "") == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_SSL_VERIFYPEER, 1L) == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_SSL_VERIFYHOST, 2L) == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_SSLVERSION, long{CURL_SSLVERSION_TLSv1_2}) == CURLE_OK &&
         (call_.trust.empty() ||
          (curl_easy_setopt(curl, CURLOPT_CAINFO, call_.trust.c_str()) == CURLE_OK &&
           curl_easy_setopt(curl, CURLOPT_CAPATH, nullptr) == CURLE_OK)) &&
         (call_.pin.empty() ||
          curl_easy_setopt(curl, CURLOPT_PINNEDPUBLICKEY, call_.pin.c_str()) == CURLE_OK);
}

bool Transfer::SetOptions() {
  CURL* curl = handle_.get();
  curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(curl, CURLOPT_CONNECTTIMEOUT, kConnectTimeout);
  curl_easy_setopt(curl, CURLOPT_ERRORBUFFER, message_);
  curl_easy_setopt(curl, CURLOPT_HTTP_VERSION, long{CURL_HTTP_VERSION_1_1});
  curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, TakeAnswer);
  curl_easy_setopt(curl, CURLOPT_WRITEDATA, this);
  curl_easy_setopt(curl, CURLOPT_PRIVATE, this);
  curl_easy_setopt(curl, CURLOPT_POST, 1L);
  if (call_.upload >= 0) {
    curl_easy_setopt(curl, CURLOPT_READFUNCTION, GiveUpload);
    curl_easy_setopt(curl, CURLOPT_READDATA, this);
    curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, curl_off_t{call_.uploadLength});
  } else {
    curl_easy_setopt(curl, CURLOPT_POSTFIELDS, call_.body.c_str());
    curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(call_.body.size()));
  }
  return curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers_.get()) == CURLE_OK &&
         curl_easy_setopt(curl, CURLOPT_URL, call_.url.c_str()) == CURLE_OK;
}

/// Nothing is thrown through the transport, which is written in C.
size_t Transfer::TakeAnswer(char* data, size_t, size_t count, void* object) {
  auto* self = static_cast<Transfer*>(object);
  std::string& answer = self->call_.answer;
  if (count > kLongestAnswer - answer.size()) {
    return 0;
  }
  try {
    answer.append(data, count);
  } catch (const std::bad_alloc&) {
    self->hasNoMemory_ = true;
    return 0;
  }
  return count;
}

/// What the client has sent so far; nobody waits for it here, since other calls are on their way.
size_t Transfer::GiveUpload(char* buffer, size_t, size_t room, void* object) {
  auto* self = static_cast<Transfer*>(object);
  const int64_t left = self->call_.uploadLength - self->sent_;
  if (left == 0) {
    return 0;
  }
  pollfd ready{self->call_.upload, POLLIN, 0};
  if (poll(&ready, 1, 0) == 0) {
    self->isPaused_ = true;
    return CURL_READFUNC_PAUSE;
  }
  const auto wanted = static_cast<size_t>(std::min<int64_t>(left, static_cast<int64_t>(room)));
  const ssize_t count = TEMP_FAILURE_RETRY(read(self->call_.upload, buffer, wanted));
  if (count <= 0) {
    return CURL_READFUNC_ABORT;
  }
  self->sent_ += count;
  return static_cast<size_t>(count);
}

void Transfer::Continue() {
  if (isPaused_) {
    isPaused_ = false;
    curl_easy_pause(handle_.get(), CURLPAUSE_CONT);
  }
}

bool Transfer::IsInTime() {
  const int64_t length = call_.upload >= 0 ? call_.uploadLength : int64_t(call_.body.size());
  curl_off_t uploaded = 0;
  curl_easy_getinfo(handle_.get(), CURLINFO_SIZE_UPLOAD_T, &uploaded);
  const auto now = Clock::now();
  if (uploaded != uploaded_) {
    uploaded_ = uploaded;
    moved_ = now;
  }
  const auto waited = now - moved_;
  if (uploaded < length) {
    if (waited > kSendStall + std::chrono::seconds(kConnectTimeout)) {
      Fail(isPaused_ ? CRED_REQUEST_BAD_BODY : CRED_REQUEST_TIMEOUT, "the request stalled");
      return false;
    }
    return true;
  }
  if (waited > std::chrono::seconds(call_.timeout)) {
    Fail(CRED_REQUEST_TIMEOUT, "no whole answer within " + std::to_string(call_.timeout) + " s");
    return false;
  }
  return true;
}

void Transfer::Finish(CURLcode result) {
  long status = 0;
  const char* type = nullptr;
  curl_easy_getinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
  curl_easy_getinfo(handle_.get(), CURLINFO_CONTENT_TYPE, &type);
  if (hasNoMemory_) {
    Fail(CRED_REQUEST_BROKEN, "no memory is left for the answer");
  } else if (result != CURLE_OK) {
    Fail(errorOf(result), message_[0] != '\0' ? message_ : curl_easy_strerror(result));
  } else if (!isMethodsAnswer(status, type)) {
    Fail(CRED_REQUEST_REFUSED, "its web server answered with status " + std::to_string(status));
  }
}

void Transfer::Fail(CredRequestError error, const std::string& reason) {
  call_.error = error;
  std::string().swap(call_.answer);
  call_.reason = reason;
}

}  // namespace QELO::Platform
