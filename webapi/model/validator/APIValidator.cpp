#include "webapi/APIValidator.h"

#include <sys/socket.h>

#include <algorithm>
#include <atomic>
#include <cfloat>
#include <mutex>

#include "webapi/model/validator/APIValidatorPrivate.h"
#include "webapi/platform/Network.h"

namespace QELO {
namespace {

// A backslash has no meaning inside of brackets: it stands for itself.
constexpr char kEMail[] = R"(^[a-zA-Z0-9!#$%&'*+-\/?^_`{|}~\.",()<=>]+@([a-zA-Z0-9_&%!#+-\.]+)$)";
constexpr char kNetbios[] = "^[a-zA-Z][_a-zA-Z0-9-]{0,254}$";
constexpr char kWorkGroup[] = R"([^][;:"<>*+\/|?,])";
constexpr char kDigit[] = "^([0-9]+)$";
constexpr char kTavlinkId[] = "^([a-zA-Z0-9-]+)$";

constexpr int kMaxPort = 65535;

std::atomic<APIValidator*> instance{nullptr};
std::mutex creation;

bool isCText(const std::string& text) {
  return text.find('\0') == std::string::npos;
}

bool matches(const std::string& text, const char* pattern) {
  return !text.empty() && APIValidator::CheckRegex(text, pattern);
}

/// What the platform says of the text; 0 for one that it is not asked about.
int ask(const std::string& text, int (*check)(const char*)) {
  return !text.empty() && isCText(text) ? check(text.c_str()) : 0;
}

bool holds(const Json::Value& list, const Json::Value& value) {
  return list.isArray() && std::find(list.begin(), list.end(), value) != list.end();
}

}  // namespace

APIValidator::APIValidator() : private_(std::make_unique<APIValidatorPrivate>()) {}

APIValidator::~APIValidator() = default;

APIValidator* APIValidator::GetInstance() {
  if (instance.load(std::memory_order_acquire) == nullptr) {
    const std::lock_guard<std::mutex> lock(creation);
    if (instance.load(std::memory_order_relaxed) == nullptr) {
      instance.store(new APIValidator, std::memory_order_release);
    }
  }
  return instance.load(std::memory_order_relaxed);
}

bool APIValidator::CheckRegex(const std::string& value, const char* pattern) {
  const regex_t* expression = nullptr;
  return pattern != nullptr && isCText(value) &&
         GetInstance()->private_->GetRegex(pattern, expression) && expression != nullptr &&
         regexec(expression, value.c_str(), 0, nullptr, 0) == 0;
}

bool APIValidator::IsEMail(const std::string& text) {
  return matches(text, kEMail);
}

bool APIValidator::IsNetbios(const std::string& text) {
  return matches(text, kNetbios);
}

bool APIValidator::IsWorkGroup(const std::string& text) {
  return matches(text, kWorkGroup);
}

bool APIValidator::IsDigit(const std::string& text) {
  return matches(text, kDigit);
}

bool APIValidator::IsTavlinkId(const std::string& text) {
  return matches(text, kTavlinkId);
}

bool APIValidator::IsHostname(const std::string& text) {
  return ask(text, BlQLIBIsHostname) != 0;
}

bool APIValidator::IsDomain(const std::string& text) {
  return ask(text, BlQLIBIsDomain) != 0;
}

bool APIValidator::IsIP(const std::string& text) {
  return ask(text, QELONetGetAddrType) != 0;
}

bool APIValidator::IsIPv4(const std::string& text) {
  return ask(text, QELONetGetAddrType) == AF_INET;
}

bool APIValidator::IsIPv6(const std::string& text) {
  return ask(text, QELONetGetAddrType) == AF_INET6;
}

bool APIValidator::IsPort(const int& port) {
  return static_cast<unsigned int>(port) <= kMaxPort;
}

bool APIValidator::IsEqual(const APIParameter<double>& parameter, double value) {
  if (!isGiven(parameter)) {
    return false;
  }
  const double difference = parameter.Get() - value;
  return difference >= -DBL_EPSILON && difference <= DBL_EPSILON;
}

bool APIValidator::IsEqual(const APIParameter<std::string>& parameter, const char* value) {
  return isGiven(parameter) && value != nullptr && parameter.Get() == value;
}

bool APIValidator::IsBelong(const APIParameter<std::string>& parameter, const Json::Value& list) {
  return isGiven(parameter) && holds(list, parameter.Get());
}

bool APIValidator::IsBelong(const APIParameter<Json::Value>& parameter, const Json::Value& list) {
  return isGiven(parameter) && holds(list, parameter.Get());
}

bool APIValidator::IsBetween(const APIParameter<double>& parameter, double low, double high) {
  return IsGreater(parameter, low) && IsLess(parameter, high);
}

bool APIValidator::IsGreater(const APIParameter<double>& parameter, double bound) {
  return isGiven(parameter) && parameter.Get() - bound > DBL_EPSILON;
}

bool APIValidator::IsLess(const APIParameter<double>& parameter, double bound) {
  return isGiven(parameter) && parameter.Get() - bound < -DBL_EPSILON;
}

}  // namespace QELO
