#pragma once

#include <curl/curl.h>

#include <string>
#include <vector>

/// The transport library as a transfer sees it, without a network and with failures to order.
struct FakeCurl {
  int appends = -1;  ///< header lines that are taken before memory runs out; -1: all
  int lists = 0;     ///< lines that were not freed
  std::vector<std::string> headers;  ///< as they were handed over
  curl_write_callback write = nullptr;
  void* reader = nullptr;  ///< of what is written

  static FakeCurl& Now();
};
