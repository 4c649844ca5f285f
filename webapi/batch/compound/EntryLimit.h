#pragma once

#include <json/json.h>

namespace QELO {

class APIRequest;
class APIRunner;

/// How many entries a compound request may have, those of compound requests within it counted: each
/// may cost a process, and three bytes name one.
///
/// The outermost request is measured as a whole before any entry runs. A request within it gets
/// what was counted there, by a mark in its record that no client can set: entries that could not
/// be seen then, because they came enciphered, are refused.
namespace EntryLimit {

/// The most that this request may have, whoever calls.
unsigned Most(APIRequest& request);

/// How many entries a list has at all levels; stops counting beyond `most`.
/// @param list  an array, or an object, whose members are looked at in the same way
unsigned Count(const Json::Value& list, unsigned most);

/// Whether the caller may run that many: who is not logged in gets fewer. Asks the runner who
/// calls, at the price of a permission check, for a number alone that needs it.
bool AllowsCaller(APIRequest& request, unsigned entries, APIRunner& runner);

/// Marks an entry's request as part of one that was measured.
/// @param most  that were counted there in all
void Mark(APIRequest& entry, unsigned most);

}  // namespace EntryLimit
}  // namespace QELO
