// An API that shows what the made-up host gives its methods.

#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>
#include <webapi/Method.h>

#include <ctime>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace {

using QELO::Call;

struct Text {
  std::string text;
  static constexpr auto Fields() {
    return QELO::Fields(QELO::Required("text", &Text::text).Length(1, 10));
  }
};

Json::Value Who(const Call& call) {
  Json::Value data;
  data["user"] = call.User();
  data["admin"] = call.IsAdmin();
  data["address"] = call.Request().GetRemoteIP();
  data["uid"] = geteuid();
  data["gid"] = getegid();
  data["preferences"] = call.Request().GetPreferenceDir();
  data["agent"] = call.Request().GetEnv("HTTP_USER_AGENT");
  return data;
}

std::string Echo(const Call& call, const Text& given) {
  call.Response().SetHeader("X-Text", given.text);
  call.Response().AddCookie("last", given.text);
  syslog(LOG_ERR, "%s:%d echoes %s", "Sample.cpp", __LINE__, given.text.c_str());
  return given.text;
}

Json::Value Now() {
  return Json::Value(static_cast<Json::Int64>(std::time(nullptr)));
}

struct File {
  QELO::UploadedFile file;
  static constexpr auto Fields() { return QELO::Fields(QELO::Required("file", &File::file)); }
};

Json::Value Take(const File& given) {
  std::stringstream content;
  content << std::ifstream(given.file.path).rdbuf();
  Json::Value data;
  data["name"] = given.file.name;
  data["size"] = Json::UInt64{given.file.size};
  data["content"] = content.str();
  data["path"] = given.file.path;
  return data;
}

QELO::Download Give() {
  return {.content = "a,b\r\n\r\nc", .name = "table.csv", .type = "text/csv"};
}

QELO::Answered Work(const Call& call) {
  return QELO::StartWork(call, {.prefix = "sample_", .keepResult = true},
                         [](QELO::Progress& progress) {
                           progress.Tell("begun");
                           syslog(LOG_ERR, "%s:%d works", "Sample.cpp", __LINE__);
                           return "done as " + std::to_string(geteuid());
                         });
}

QELO::Answered Endless(const Call& call) {
  return QELO::StartWork(call, {.keepResult = true}, [](QELO::Progress& progress) {
    syslog(LOG_ERR, "%s:%d endless as process %d", "Sample.cpp", __LINE__, getpid());
    progress.Tell("begun");
    sleep(30);
  });
}

void Throw() {
  throw std::runtime_error("lost");
}

bool IsAllowed(const Call& call) {
  return !call.Has("forbidden");
}

constexpr char kApi[] = "QELO.Test.Sample";

QELO::_tag_API_CHECK_TABLE checks[] = {{kApi, 1, "now", QELO::Check<IsAllowed>, {nullptr, nullptr}},
                                       {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}}};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  static auto table = QELO::MethodTable(kApi, 1,
                                        {{"who", QELO::Method<Who>},
                                         {"user", QELO::Method<Who>},
                                         {"root", QELO::Method<Who>},
                                         {"other", QELO::Method<Who>},
                                         {"echo", QELO::Method<Echo>},
                                         {"now", QELO::Method<Now>},
                                         {"take", QELO::Method<Take>},
                                         {"give", QELO::Method<Give>},
                                         {"work", QELO::Method<Work>},
                                         {"endless", QELO::Method<Endless>},
                                         {"throw", QELO::Method<Throw>}});
  return table.data();
}

extern "C" WEBAPI_API QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return checks;
}
