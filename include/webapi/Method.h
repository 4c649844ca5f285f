#pragma once

#include <array>
#include <cstddef>
#include <type_traits>
#include <utility>

#include "webapi/APITable.h"
#include "webapi/APIUpload.h"
#include "webapi/method/Background.h"
#include "webapi/method/Call.h"
#include "webapi/method/Edge.h"
#include "webapi/method/Read.h"

/// Methods as plain functions. docs/method.md tells all of it.
///
///     struct Visit {
///       std::string name;
///       int times = 1;
///       static constexpr auto Fields() {
///         return QELO::Fields(QELO::Required("name", &Visit::name).Length(1, 100),
///                             QELO::Optional("times", &Visit::times).Between(1, 10));
///       }
///     };
///
///     Visit greet(const QELO::Call& call, const Visit& visit) {
///       if (visit.name == call.User()) {
///         throw QELO::Error{400};
///       }
///       return visit;
///     }
///
///     extern "C" QELO::_tag_API_TABLE* GetAPITable() {
///       static auto table =
///           QELO::MethodTable("QELO.Example.Visits", 1, {{"greet", QELO::Method<greet>}});
///       return table.data();
///     }
///
/// It is made of the exported classes alone, and methods of both styles may stand in one table.
namespace QELO {
namespace method {

template <typename Pointer>
struct Signature {
  static_assert(kNever<Pointer>, "a method is a function, or a lambda without captures");
};

/// What a function that is no method's has of a struct of parameters.
struct NoParameters {
  static constexpr auto Fields() { return std::tuple(); }
};

template <typename... Arguments>
struct ParametersOf {
  using Type = NoParameters;
};
template <typename First, typename... More>
struct ParametersOf<First, More...> {
  using Bare = std::remove_cvref_t<First>;
  static constexpr bool kIsCall = std::same_as<Bare, Call>;
  static_assert(
      kIsCall || Described<Bare>,
      "a method takes a QELO::Call, a struct with Fields(), or both; one of (APIRequest*, "
      "APIResponse*) stands in the table by itself");
  static_assert(!std::is_lvalue_reference_v<First> || kIsCall ||
                    std::is_const_v<std::remove_reference_t<First>>,
                "a method takes its parameters by value or as a reference to const");
  using Rest = typename ParametersOf<More...>::Type;
  static_assert(kIsCall || std::same_as<Rest, NoParameters>,
                "a method takes one struct of parameters");
  using Type = std::conditional_t<kIsCall, Rest, Bare>;
};

template <typename R, typename... Arguments, bool kNoexcept>
struct Signature<R (*)(Arguments...) noexcept(kNoexcept)> {
  using Parameters = typename ParametersOf<Arguments...>::Type;

  static R Invoke(R (*function)(Arguments...), Call& call, Parameters& parameters) {
    return function(Choose<Arguments>(call, parameters)...);
  }

 private:
  template <typename Argument>
  static auto& Choose(Call& call, Parameters& parameters) {
    if constexpr (std::same_as<std::remove_cvref_t<Argument>, Call>) {
      return call;
    } else {
      return parameters;
    }
  }
};

template <typename... Ts>
constexpr bool HasFiles(const std::tuple<Ts...>&) {
  return (kIsFile<typename Ts::Member> || ...);
}

/// @return false when the parameters are not what the struct declares: error 101 has been answered
template <Described T>
bool ReadParameters(const Call& call, T& parameters) {
  if constexpr (std::same_as<T, NoParameters>) {
    return true;
  }
  Faults faults;
  Json::Value files;
  if constexpr (HasFiles(decltype(T::Fields())())) {
    files = APIUpload(&call.Request()).GetFiles();
  }
  const Json::Value none;
  ReadFields(call.Request().GetParamRef("", none), files, Path(), parameters, faults);
  if (faults.Count() > 0) {
    call.Response().SetError(WEBAPI_ERR_BAD_REQUEST, faults.List());
  }
  return faults.Count() == 0;
}

}  // namespace method

/// A function as an entry of a table. It takes a Call, a struct of parameters, or both, or nothing,
/// and gives what is the answer's data: a struct, a Json::Value or what else ToJson() takes,
/// nothing (void), a Download, a Result of one of these, or Answered.
///
/// Parameters that are not what the struct declares answer 101, with each that is wrong as an
/// object {"path", "rule", "message"}, and the function is not called. An Error that it throws is
/// the answer; any other exception answers 117 and is logged.
template <auto kFunction>
void Method(APIRequest* request, APIResponse* response) {
  using Signature = method::Signature<decltype(+kFunction)>;
  Call call(*request, *response);
  method::Guarded(*response, [&] {
    typename Signature::Parameters parameters{};
    if (method::ReadParameters(call, parameters)) {
      method::AnswerWith(*response,
                         [&] { return Signature::Invoke(+kFunction, call, parameters); });
    }
  });
}

/// A function as an entry of a table of checks: it takes a Call and says whether the method may be
/// called, or throws the Error that is answered in its place. What it refuses without one is
/// answered with the error that the check of the caller has left, else with 105.
template <auto kFunction>
int Check(APIRequest* request, APIResponse* response) {
  static_assert(std::is_invocable_r_v<bool, decltype(kFunction), const Call&>,
                "a check is a function of const QELO::Call& that gives a bool");
  bool isPassed = false;
  method::Guarded(*response, [&] { isPassed = kFunction(Call(*request, *response)); });
  if (!isPassed && response->GetError() == WEBAPI_ERR_NONE) {
    response->SetError(WEBAPI_ERR_NO_PERMISSION);
  }
  return isPassed ? 1 : 0;
}

/// A method of MethodTable(): its name and Method<function>, or a function of the plain form.
struct NamedMethod {
  const char* name;
  void (*function)(APIRequest*, APIResponse*);
};

/// The table of one API with one version, its end included. What has more is written as an array of
/// _tag_API_TABLE.
template <size_t kCount>
constexpr std::array<_tag_API_TABLE, kCount + 1> MethodTable(const char* api, int version,
                                                             const NamedMethod (&methods)[kCount]) {
  std::array<_tag_API_TABLE, kCount + 1> table{};
  for (size_t i = 0; i < kCount; ++i) {
    table[i] = {api, version, methods[i].name, methods[i].function};
  }
  return table;
}

}  // namespace QELO
