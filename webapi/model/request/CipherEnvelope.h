#pragma once

#include <json/json.h>

#include <string>

/// Enciphered parameters: names that stand for others until they are deciphered.
///
/// Opening an envelope adds what is in it to the section; the envelope's own members are removed,
/// also when that fails.
namespace QELO::CipherEnvelope {

/// Holds a parameter line in the platform's own cipher.
inline constexpr char kCipherText[] = "__cIpHeRtExT";

/// Removes the member from an object that has it and gives its text.
std::string take(Json::Value& section, const char* name);

/// Adds a parameter line's names and values to the section.
bool addLine(const std::string& line, Json::Value& section);

/// Deciphers a line of the platform's own cipher, which ends at its first NUL, before and after.
/// @param opened  unless null, receives the line
bool openText(std::string text, Json::Value& section, std::string* opened = nullptr);

/// Opens the section's AES envelope; true when it has none.
/// @param opened  unless null, receives the line, and stays as it is without an envelope
bool openAes(Json::Value& section, std::string* opened = nullptr);

}  // namespace QELO::CipherEnvelope
