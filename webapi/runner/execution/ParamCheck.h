#pragma once

#include <json/json.h>

namespace QELO {

class APIRequest;
class APIResponse;

/// The check of a call's parameters against what its method's description declares, "params".
namespace ParamCheck {

/// Reads the parameters as they are declared, fills in defaults and checks them. The framework's
/// own parameters are left out of it, unless the description declares them. Texts that were kept
/// with the request are forgotten.
/// @param attributes  the method's
/// @return true also when nothing is declared; else the response has error 101 with a list of
///         {"path", "rule", "message"}, 103 when what is declared is no schema, or 117 when schemas
///         cannot be read here, both logged
bool Passes(APIRequest& request, APIResponse& response, const Json::Value& attributes);

}  // namespace ParamCheck
}  // namespace QELO
