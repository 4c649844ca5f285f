#include <glob.h>
#include <grp.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <string_view>

#include "programs/webapi/Arguments.h"
#include "programs/webapi/doctor/Diagnosis.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::AuthorProgram {
namespace {

constexpr bool kIsHost = sizeof WEBAPI_ROOT_PREFIX == 1;
constexpr size_t kLongestConfiguration = 1U << 20U;  // bytes
constexpr char kForkServer[] = "/run/webapi-server/server.sock";
constexpr char kSyslog[] = "/dev/log";
constexpr unsigned kEntryMode = 04750;

/// Where web servers have their configurations on this system.
constexpr const char* kConfigurations[] = {
    "/etc/lighttpd/lighttpd.conf", "/etc/lighttpd/conf-enabled/*", "/etc/nginx/nginx.conf",
    "/etc/nginx/conf.d/*",         "/etc/nginx/sites-enabled/*",   "/etc/apache2/apache2.conf",
    "/etc/apache2/conf-enabled/*", "/etc/apache2/sites-enabled/*",
};

bool holds(std::string_view text, std::string_view part) {
  return text.find(part) != std::string_view::npos;
}

/// The lines without those that are comments as a whole.
std::string uncommented(std::string_view text) {
  std::string lines;
  while (!text.empty()) {
    const size_t end = text.find('\n');
    const std::string_view line = text.substr(0, end);
    const size_t first = line.find_first_not_of(" \t");
    if (first != std::string_view::npos && line[first] != '#') {
      lines.append(line).append("\n");
    }
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
  }
  return lines;
}

std::string textOf(const std::string& path) {
  UniqueFd file;
  struct stat info {};
  std::string text;
  if (OpenRegularFile(AT_FDCWD, path.c_str(), file, info, 0) != 0 ||
      !ReadText(file.Get(), kLongestConfiguration, text)) {
    return "";
  }
  return uncommented(text);
}

/// What lighttpd does with a query unless it is told otherwise.
void lookAtLighttpd(const std::string& path, const std::string& text, Diagnosis& diagnosis) {
  if (!holds(text, "url-normalize")) {
    diagnosis.Wrong(Shown(path) + " lets the server change queries",
                    "server.http-parseopts = (\"url-normalize\" => \"disable\")");
  }
  if (!holds(text, "server.stream-response-body")) {
    diagnosis.Note(Shown(path) +
                   " keeps downloads whole before it sends them; "
                   "server.stream-response-body = 2");
  }
  if (holds(text, "accesslog.filename") && !holds(text, "accesslog.format")) {
    diagnosis.Wrong(Shown(path) + " logs queries, and session ids with them",
                    "accesslog.format = \"%h %t \\\"%m %U\\\" %>s %b\"");
  }
}

/// @return whether it serves the web API
bool lookAtConfiguration(const std::string& path, Diagnosis& diagnosis) {
  const std::string text = textOf(path);
  if (!holds(text, "entry.cgi") && !holds(text, "entry\\.cgi") && !holds(text, "webapi-server")) {
    return false;
  }
  const int before = diagnosis.Count();
  if (holds(text, "server.modules") || holds(text, "cgi.assign") || holds(text, "scgi.server")) {
    lookAtLighttpd(path, text, diagnosis);
  }
  if (diagnosis.Count() == before) {
    diagnosis.Good("web server's configuration " + Shown(path));
  }
  return true;
}

}  // namespace

int Connect(const std::string& path, int type) {
  sockaddr_un address{};
  if (path.size() >= sizeof address.sun_path) {
    return ENAMETOOLONG;
  }
  address.sun_family = AF_UNIX;
  memcpy(address.sun_path, path.c_str(), path.size() + 1);
  const UniqueFd socket(::socket(AF_UNIX, type | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  return connect(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0
             ? 0
             : errno;
}

void LookAtEntry(const std::string& entry, Diagnosis& diagnosis) {
  struct stat info {};
  if (stat(entry.c_str(), &info) != 0) {
    return diagnosis.Wrong("the CGI program " + Shown(entry) + ": " + strerror(errno),
                           "install again");
  }
  const unsigned mode = info.st_mode & 07777U;
  const group* owner = getgrgid(info.st_gid);
  const std::string name = owner != nullptr ? owner->gr_name : std::to_string(info.st_gid);
  if (!kIsHost) {
    return diagnosis.Good("the CGI program " + Shown(entry));
  }
  const std::string remedy =
      "chgrp SERVER'S-GROUP " + Shown(entry) + " && chmod 4750 " + Shown(entry);
  if (info.st_uid != 0 || (mode & 06000U) != 04000U) {
    diagnosis.Wrong("the CGI program " + Shown(entry) +
                        " does not take root's rights, and calls "
                        "answer 117",
                    remedy);
  } else if ((mode & ~kEntryMode) != 0) {
    diagnosis.Wrong("the CGI program " + Shown(entry) + " can be used by everybody", remedy);
  } else if (info.st_gid == 0) {
    diagnosis.Wrong("the CGI program " + Shown(entry) + " can be used by no web server", remedy);
  } else {
    diagnosis.Good("the CGI program " + Shown(entry) + ", for the group " + name);
  }
}

void LookAtWebServer(const std::string& file, Diagnosis& diagnosis) {
  if (!file.empty()) {
    if (!lookAtConfiguration(file, diagnosis)) {
      diagnosis.Wrong(Shown(file) + " names neither entry.cgi nor webapi-server",
                      "docs/webservers.md has recipes");
    }
    return;
  }
  if (!kIsHost) {
    return;
  }
  bool isServed = false;
  for (const char* pattern : kConfigurations) {
    glob_t files{};
    if (glob(pattern, 0, nullptr, &files) == 0) {
      for (size_t i = 0; i < files.gl_pathc; ++i) {
        isServed = lookAtConfiguration(files.gl_pathv[i], diagnosis) || isServed;
      }
    }
    globfree(&files);
  }
  if (!isServed) {
    diagnosis.Wrong("no web server's configuration in the usual places names entry.cgi",
                    "--config names another, docs/webservers.md has recipes");
  }
}

void LookAtSockets(Diagnosis& diagnosis) {
  const int syslog = Connect(kSyslog, SOCK_DGRAM);
  if (syslog == 0 || syslog == EPROTOTYPE) {
    diagnosis.Good(std::string("syslog ") + kSyslog);
  } else {
    diagnosis.Wrong(std::string("nobody listens at ") + kSyslog +
                        ", and log lines are lost: " + strerror(syslog),
                    "install rsyslog, or start the journal");
  }
  if (!kIsHost || access(kForkServer, F_OK) != 0) {
    return;  // who wants none has none
  }
  const int error = Connect(kForkServer, SOCK_STREAM);
  if (error == 0 || error == EAGAIN) {
    diagnosis.Good(std::string("fork server ") + kForkServer);
  } else {
    diagnosis.Wrong(std::string("fork server ") + kForkServer + ": " + strerror(error),
                    "systemctl restart webapi-server");
  }
}

}  // namespace QELO::AuthorProgram
