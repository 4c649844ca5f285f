// The yardstick: a CGI program that links the JSON library and prints one object.

#include <json/json.h>

#include <cstdio>

int main() {
  Json::Value answer;
  answer["success"] = true;
  answer["data"]["user"] = "nobody";
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::printf("Content-Type: application/json\r\n\r\n%s",
              Json::writeString(builder, answer).c_str());
  return 0;
}
