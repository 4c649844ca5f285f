// Spoils the standard streams and descriptors of its process, which has an answer to print after
// it, in the way that the parameter "how" names.
//
// Tests: MistreatedStreamsTest.cpp, test_faulty_libraries.py

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cwchar>
#include <functional>
#include <iostream>
#include <map>
#include <sstream>
#include <string>

#include "PluginTable.h"

static void closeStreams() {
  std::fclose(stdin);
  std::fclose(stdout);
}

static void closeDescriptors() {
  close(STDIN_FILENO);
  close(STDOUT_FILENO);
}

static void useWideStreams() {
  wchar_t line[16];
  std::fgetws(line, 16, stdin);
  std::wprintf(L"wide C stream");
}

static void useWideCppStreams() {
  std::wstring word;
  std::wcin >> word;
  std::wcout << L"wide C++ stream" << std::endl;
}

static void openAnew() {
  std::freopen("/dev/null", "w", stdin);
  std::freopen("/dev/null", "r", stdout);
}

static void lendABuffer() {
  static char lent[64];  // goes with the library
  std::setvbuf(stdout, lent, _IOFBF, sizeof lent);
  std::printf("pending");
}

/// Buffers that are gone when the method returns.
static void leaveDeadBuffers() {
  const std::stringbuf narrow;
  const std::wstringbuf wide;
  for (std::ios* stream :
       {static_cast<std::ios*>(&std::cin), static_cast<std::ios*>(&std::cout),
        static_cast<std::ios*>(&std::cerr), static_cast<std::ios*>(&std::clog)}) {
    stream->rdbuf(const_cast<std::stringbuf*>(&narrow));
  }
  std::wcout.rdbuf(const_cast<std::wstringbuf*>(&wide));
  std::wcerr.rdbuf(const_cast<std::wstringbuf*>(&wide));
}

static void tieDeadStreams() {
  std::ostringstream dead;
  dead << "text";
  std::cin.tie(&dead);
  std::cout.tie(&dead);
}

static void makeErrorsThrow() {
  std::cout.exceptions(std::ios::failbit | std::ios::badbit);
  try {
    std::cout.rdbuf(nullptr);
  } catch (const std::ios_base::failure&) {
  }
}

static void leaveSynchronisation() {
  std::ios::sync_with_stdio(false);
  std::cout << "unsynchronised";
  std::wcout << L"unsynchronised";
}

static void replaceStreams() {
  stdin = std::fopen("/dev/zero", "re");
  stdout = std::fopen("/dev/null", "we");
}

/// All that it did not open, and opens files of its own in their place.
static void closeTheRest() {
  close_range(3, ~0U, 0);
  for (int i = 0; i < 16; ++i) {
    open("/dev/full", O_RDWR);
  }
}

static void run(QELO::APIRequest* request, QELO::APIResponse* response) {
  static const std::map<std::string, std::function<void()>> ways = {
      {"closed", closeStreams},      {"descriptors", closeDescriptors},
      {"wide", useWideStreams},      {"wideCpp", useWideCppStreams},
      {"reopened", openAnew},        {"lent", lendABuffer},
      {"dead", leaveDeadBuffers},    {"tied", tieDeadStreams},
      {"throwing", makeErrorsThrow}, {"unsynchronised", leaveSynchronisation},
      {"replaced", replaceStreams},  {"rest", closeTheRest},
  };
  ways.at(request->GetParam("how").asString())();
  response->SetSuccess("done");
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
