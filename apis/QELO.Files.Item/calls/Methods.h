#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

/// The methods of the API, as README.md tells them.
namespace files {

void list(QELO::APIRequest* request, QELO::APIResponse* response);
void stat(QELO::APIRequest* request, QELO::APIResponse* response);
void createFolder(QELO::APIRequest* request, QELO::APIResponse* response);
void rename(QELO::APIRequest* request, QELO::APIResponse* response);
void copy(QELO::APIRequest* request, QELO::APIResponse* response);
void move(QELO::APIRequest* request, QELO::APIResponse* response);
void remove(QELO::APIRequest* request, QELO::APIResponse* response);
void download(QELO::APIRequest* request, QELO::APIResponse* response);
void upload(QELO::APIRequest* request, QELO::APIResponse* response);
void tus(QELO::APIRequest* request, QELO::APIResponse* response);

}  // namespace files
