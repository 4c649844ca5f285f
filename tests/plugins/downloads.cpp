// Prints answers of its own, as downloads do: header lines, an empty line and a body. What a caller
// with an output descriptor gets is the body alone.
//
// Tests: OutputTest.cpp, exec_program.py

#include <unistd.h>

#include <cstdio>
#include <iostream>
#include <string>

#include "PluginTable.h"

static const char kHead[] = "Content-Type: text/plain\r\nX-Number: 1\r\n\r\n";

/// Prints "body" by the way that "way" names, to the end of the method or in pieces.
static void print(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string text = kHead + request->GetParam("body", "").asString();
  const std::string way = request->GetParam("way", "").asString();
  if (way == "stream") {
    std::cout << text;
  } else if (way == "file") {
    std::fwrite(text.data(), 1, text.size(), stdout);
  } else {
    [[maybe_unused]] const ssize_t count = write(STDOUT_FILENO, text.data(), text.size());
  }
  response->SetEnableOutput(false);
  response->SetSuccess("printed");
}

/// Prints a body of "size" bytes that has every byte in it.
static void bytes(QELO::APIRequest* request, QELO::APIResponse* response) {
  std::string body(request->GetParam("size").asUInt(), '\0');
  for (size_t i = 0; i < body.size(); ++i) {
    body[i] = static_cast<char>(i % 256);
  }
  std::fputs(kHead, stdout);
  std::fwrite(body.data(), 1, body.size(), stdout);
  response->SetSuccess("printed");
}

/// Prints "text" as it is, at once.
static void bare(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string text = request->GetParam("text").asString();
  [[maybe_unused]] const ssize_t count = write(STDOUT_FILENO, text.data(), text.size());
  response->SetSuccess("printed");
}

/// Sends its errors where its output goes, prints "body" and answers a text of "size" bytes.
static void shared(QELO::APIRequest* request, QELO::APIResponse* response) {
  dup2(STDOUT_FILENO, STDERR_FILENO);
  const std::string text = kHead + request->GetParam("body").asString();
  [[maybe_unused]] const ssize_t count = write(STDERR_FILENO, text.data(), text.size());
  response->SetSuccess(std::string(request->GetParam("size").asUInt(), 'x'));
}

/// Prints a head whose end comes in two pieces.
static void split(QELO::APIRequest*, QELO::APIResponse* response) {
  [[maybe_unused]] ssize_t count = write(STDOUT_FILENO, "X-Number: 1\r\n", 13);
  usleep(200000);
  count = write(STDOUT_FILENO, "\r\nbody", 6);
  response->SetSuccess("printed");
}

/// Prints half of a body and ends the process.
static void broken(QELO::APIRequest*, QELO::APIResponse*) {
  std::fputs(kHead, stdout);
  std::fputs("half", stdout);
  std::fflush(stdout);
  _exit(1);
}

#define DOWNLOAD(method) \
  { "QELO.Test.Download", 1, #method, method }

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {DOWNLOAD(print),
                                         DOWNLOAD(bytes),
                                         DOWNLOAD(bare),
                                         DOWNLOAD(split),
                                         DOWNLOAD(broken),
                                         DOWNLOAD(shared),
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
