#pragma once

#include <string>
#include <vector>

/// Bodies as clients send them.
namespace Form {

inline constexpr char kType[] = "multipart/form-data; boundary=B";

inline std::string Part(const std::string& parameters, const std::string& content) {
  return "--B\r\nContent-Disposition: form-data; " + parameters + "\r\n\r\n" + content + "\r\n";
}
inline std::string Field(const std::string& name, const std::string& value) {
  return Part("name=\"" + name + "\"", value);
}
inline std::string File(const std::string& field, const std::string& name,
                        const std::string& content) {
  return Part("name=\"" + field + "\"; filename=\"" + name + "\"", content);
}
inline std::string End() {
  return "--B--\r\n";
}

}  // namespace Form
