// QELO.Host.Info: what the host is and how it is doing.

#include <sys/sysinfo.h>
#include <unistd.h>
#include <webapi/Method.h>

#include <climits>
#include <cstdlib>
#include <fstream>
#include <string>

#include "Volumes.h"

namespace {

std::string HostName() {
  char name[HOST_NAME_MAX + 1] = "";
  return gethostname(name, sizeof(name)) == 0 ? name : "";
}

Json::Value Uptime() {
  struct sysinfo info {};
  return sysinfo(&info) == 0 ? Json::Value(static_cast<Json::Int64>(info.uptime)) : Json::Value();
}

/// The averages of 1, 5 and 15 minutes, as many as the host tells.
Json::Value Load() {
  double load[3];
  Json::Value averages(Json::arrayValue);
  for (int i = 0, count = getloadavg(load, 3); i < count; ++i) {
    averages.append(load[i]);
  }
  return averages;
}

Json::Value Memory() {
  constexpr const char* kFields[][2] = {
      {"MemTotal:", "total"}, {"MemFree:", "free"}, {"MemAvailable:", "available"}};
  Json::Value memory(Json::objectValue);
  std::ifstream file("/proc/meminfo");
  std::string name;
  Json::UInt64 kibibytes = 0;
  std::string rest;
  while (file >> name >> kibibytes && std::getline(file, rest)) {
    for (const auto& [field, key] : kFields) {
      if (name == field) {
        memory[key] = kibibytes * 1024;
      }
    }
  }
  return memory;
}

Json::Value Get() {
  Json::Value data(Json::objectValue);
  data["hostName"] = HostName();
  data["uptime"] = Uptime();
  data["load"] = Load();
  data["memory"] = Memory();
  data["volumes"] = hostinfo::Volumes(".");  // a call stands in the system's own directory
  return data;
}

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  static auto table = QELO::MethodTable("QELO.Host.Info", 1, {{"get", QELO::Method<Get>}});
  return table.data();
}
