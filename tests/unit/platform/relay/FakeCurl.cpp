#include "tests/unit/platform/relay/FakeCurl.h"

#include <cstdarg>
#include <cstdlib>
#include <cstring>

#undef curl_easy_setopt
#undef curl_easy_getinfo

FakeCurl& FakeCurl::Now() {
  static FakeCurl fake;
  return fake;
}

namespace {

void takeHeaders(const curl_slist* list) {
  FakeCurl::Now().headers.clear();
  for (; list != nullptr; list = list->next) {
    FakeCurl::Now().headers.emplace_back(list->data);
  }
}

}  // namespace

extern "C" {

CURL* curl_easy_init() {
  return &FakeCurl::Now();
}

void curl_easy_cleanup(CURL*) {}

CURLcode curl_easy_setopt(CURL*, CURLoption option, ...) {
  va_list values;
  va_start(values, option);
  if (option == CURLOPT_HTTPHEADER) {
    takeHeaders(va_arg(values, const curl_slist*));
  } else if (option == CURLOPT_WRITEFUNCTION) {
    FakeCurl::Now().write = va_arg(values, curl_write_callback);
  } else if (option == CURLOPT_WRITEDATA) {
    FakeCurl::Now().reader = va_arg(values, void*);
  }
  va_end(values);
  return CURLE_OK;
}

CURLcode curl_easy_getinfo(CURL*, CURLINFO, ...) {
  return CURLE_OK;
}

CURLcode curl_easy_pause(CURL*, int) {
  return CURLE_OK;
}

const char* curl_easy_strerror(CURLcode) {
  return "failed";
}

curl_slist* curl_slist_append(curl_slist* list, const char* text) {
  FakeCurl& fake = FakeCurl::Now();
  if (fake.appends == 0) {
    return nullptr;
  }
  fake.appends -= fake.appends > 0 ? 1 : 0;
  auto* added = new curl_slist{strdup(text), nullptr};
  ++fake.lists;
  if (list == nullptr) {
    return added;
  }
  curl_slist* last = list;
  while (last->next != nullptr) {
    last = last->next;
  }
  last->next = added;
  return list;
}

void curl_slist_free_all(curl_slist* list) {
  while (list != nullptr) {
    curl_slist* next = list->next;
    free(list->data);
    delete list;
    --FakeCurl::Now().lists;
    list = next;
  }
}

}  // extern "C"
