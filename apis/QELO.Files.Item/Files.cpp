// QELO.Files.Item: the files and folders of shared folders, looked at, changed and moved in and
// out.

#include <webapi/APITable.h>

#include "calls/Methods.h"

namespace {

constexpr char kApi[] = "QELO.Files.Item";

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "list", files::list},
    {kApi, 1, "stat", files::stat},
    {kApi, 1, "create_folder", files::createFolder},
    {kApi, 1, "rename", files::rename},
    {kApi, 1, "copy", files::copy},
    {kApi, 1, "move", files::move},
    {kApi, 1, "remove", files::remove},
    {kApi, 1, "download", files::download},
    {kApi, 1, "upload", files::upload},
    {kApi, 1, "tus", files::tus},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
