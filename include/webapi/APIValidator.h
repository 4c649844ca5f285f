#pragma once

#include <json/json.h>

#include <concepts>
#include <memory>
#include <string>
#include <type_traits>

#include "webapi/APIParameter.h"
#include "webapi/Export.h"

namespace QELO {

class APIValidatorPrivate;

/// Checks of values: texts, ports and typed parameters.
///
/// A check says yes or no and sets no error. Text checks and IsPort() have the form that the
/// getters of APIRequest take as validator: `GetAndCheckString("mail",
/// APIRequest::PARAM_REQUIRED, APIValidator::IsEMail)`. An empty text passes none of them, nor does
/// one that holds a NUL: checks read C texts, which end there, and what stands behind it would pass
/// unseen. One thread uses the checks.
class WEBAPI_API APIValidator {
 public:
  /// The one instance, made at its first use and never destroyed. It holds what patterns were
  /// compiled to; the checks find it by themselves.
  static APIValidator* GetInstance();

  APIValidator(const APIValidator&) = delete;
  APIValidator& operator=(const APIValidator&) = delete;

  /// Whether a POSIX extended regular expression matches somewhere in the value.
  /// @param pattern  a constant of the program: compiled once, then known by its address
  /// @return false also when the pattern cannot be compiled (logged) or the value holds a NUL
  static bool CheckRegex(const std::string& value, const char* pattern);

  /// A mail address by its look: characters that may stand there around an "@".
  static bool IsEMail(const std::string& text);
  /// A letter, then at most 254 letters, digits, "_" and "-".
  static bool IsNetbios(const std::string& text);
  /// At least one character that is none of ] [ ; : " < > * + \ / | ? and the comma; the others may
  /// be any.
  static bool IsWorkGroup(const std::string& text);
  /// ASCII digits alone.
  static bool IsDigit(const std::string& text);
  /// ASCII letters, digits and "-".
  static bool IsTavlinkId(const std::string& text);
  /// A name of a host: labels of 1 to 63 letters, digits and inner hyphens, 253 characters in all
  /// (RFC 952, RFC 1123); internationalised labels in their ASCII form (RFC 5891). What the system
  /// would take for an address, as "10.1", is no name.
  static bool IsHostname(const std::string& text);
  /// As IsHostname(), and the name may end with a dot. One label will do.
  static bool IsDomain(const std::string& text);
  /// An address: IsIPv4() or IsIPv6().
  static bool IsIP(const std::string& text);
  /// Four decimal numbers of 0 to 255 without leading zeros.
  static bool IsIPv4(const std::string& text);
  /// An address as RFC 4291 writes it, without brackets, prefix length or zone ("%eth0").
  static bool IsIPv6(const std::string& text);

  /// 0 to 65535.
  static bool IsPort(const int& port);

  /// Comparisons of a parameter's value. All answer false for a parameter that is not set or
  /// invalid; one that was sent as null is set and has the value 0, false, "" or null.
  ///
  /// Real numbers are equal up to DBL_EPSILON (2.2e-16), both ends included; greater and less mean
  /// by more than that, and the bounds of IsBetween() are themselves left out.

  template <typename T>
  static bool IsEqual(const APIParameter<T>& parameter, const std::type_identity_t<T>& value) {
    return isGiven(parameter) && parameter == value;
  }
  static bool IsEqual(const APIParameter<double>& parameter, double value);
  /// @param value  null equals nothing
  static bool IsEqual(const APIParameter<std::string>& parameter, const char* value);

  /// Whether a JSON array has an element that equals the value, in type too; anything but an array
  /// has none.
  static bool IsBelong(const APIParameter<std::string>& parameter, const Json::Value& list);
  static bool IsBelong(const APIParameter<Json::Value>& parameter, const Json::Value& list);

  /// low <= value <= high for integers, low < value < high for real numbers.
  template <std::integral T>
  requires(!std::same_as<T, bool>) static bool IsBetween(const APIParameter<T>& parameter,
                                                         const std::type_identity_t<T>& low,
                                                         const std::type_identity_t<T>& high) {
    return isGiven(parameter) && low <= parameter.Get() && parameter.Get() <= high;
  }
  static bool IsBetween(const APIParameter<double>& parameter, double low, double high);

  template <std::integral T>
  requires(!std::same_as<T, bool>) static bool IsGreater(const APIParameter<T>& parameter,
                                                         const std::type_identity_t<T>& bound) {
    return isGiven(parameter) && parameter.Get() > bound;
  }
  static bool IsGreater(const APIParameter<double>& parameter, double bound);

  template <std::integral T>
  requires(!std::same_as<T, bool>) static bool IsLess(const APIParameter<T>& parameter,
                                                      const std::type_identity_t<T>& bound) {
    return isGiven(parameter) && parameter.Get() < bound;
  }
  static bool IsLess(const APIParameter<double>& parameter, double bound);

 private:
  APIValidator();
  ~APIValidator();

  template <typename T>
  static bool isGiven(const APIParameter<T>& parameter) {
    return parameter.IsSet() && !parameter.IsInvalid();
  }

  std::unique_ptr<APIValidatorPrivate> private_;
};

}  // namespace QELO
