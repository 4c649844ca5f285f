#include "calls/ItemJson.h"

#include <webapi/JsonHelper.h>

#include <cstdio>

#include "paths/Shares.h"

namespace files {

Json::Value jsonOf(const VirtualPath& parent, const Item& item) {
  Json::Value json(Json::objectValue);
  const std::string name = QELO::JsonHelper::repairUtf8(item.name);
  json["name"] = name;
  json["path"] = name == item.name ? Json::Value(parent.Child(name).Text()) : Json::Value();
  json["type"] = wordOf(item.type);
  if (item.type == ItemType::kMount) {
    return json;
  }
  char mode[8];
  std::snprintf(mode, sizeof mode, "%04o", item.mode);
  json["mode"] = mode;
  json["mtime"] = Json::Int64{item.mtime};
  json["uid"] = item.uid;
  json["gid"] = item.gid;
  if (item.IsFile()) {
    json["size"] = Json::UInt64{item.size};
    json["links"] = item.links;
  }
  return json;
}

Json::Value jsonOf(const Share& share) {
  Json::Value json(Json::objectValue);
  json["name"] = share.name;
  json["path"] = "/" + share.name;
  json["type"] = "share";
  json["comment"] = share.comment;
  json["read_only"] = share.isReadOnly;
  return json;
}

}  // namespace files
