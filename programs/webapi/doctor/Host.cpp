#include <glob.h>
#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>

#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "programs/webapi/Arguments.h"
#include "programs/webapi/doctor/Diagnosis.h"
#include "programs/webapi/text/DescriptionText.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/OwnFile.h"
#include "webapi/platform/Core.h"

namespace QELO::AuthorProgram {
namespace {

constexpr bool kIsHost = sizeof WEBAPI_ROOT_PREFIX == 1;
constexpr size_t kMostFiles = 10000;  // of descriptions

/// Whether there is a group: the host's, or in the private root's own file.
bool hasGroup(const std::string& name) {
  if (kIsHost) {
    return getgrnam(name.c_str()) != nullptr;
  }
  const std::unique_ptr<FILE, int (*)(FILE*)> file(fopen(Paths::kGroup, "re"), fclose);
  while (const group* entry = file ? fgetgrent(file.get()) : nullptr) {
    if (name == entry->gr_name) {
      return true;
    }
  }
  return false;
}

void lookAtLibrary(const std::string& api, const Json::Value& description, Diagnosis& diagnosis) {
  std::string library = JsonHelper::asString(JsonHelper::member(description, "lib"));
  if (library.find('/') == std::string::npos) {
    return;  // found by the loader, or the framework's own
  }
  if (library.front() != '/') {
    library = Paths::kDescriptionDir + library;
  }
  if (access(library.c_str(), F_OK) != 0) {
    diagnosis.Wrong("the library of " + Shown(api) + ", " + Shown(library) + ", is not there",
                    "install it, or its calls answer 111");
  } else if (OthersMayChange(library)) {
    diagnosis.Wrong("others may write " + Shown(library) + " or its directory, so it is not loaded",
                    "chmod go-w, and chown root");
  }
}

void lookAtSocket(const std::string& api, const Json::Value& description, Diagnosis& diagnosis) {
  const std::string path = JsonHelper::asString(JsonHelper::member(description, "socket"));
  if (path.empty() || JsonHelper::asBool(JsonHelper::member(description, "disableSocket"))) {
    return;
  }
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) {
    diagnosis.Note("nobody listens at the socket of " + Shown(api) + ", " + Shown(path) +
                   ", so its methods run without the daemon; systemctl enable --now qeloapid");
  } else if (OthersMayChange(path)) {
    diagnosis.Wrong("others may write " + Shown(path) +
                        " or its directory, and whoever listens "
                        "there is handed sessions",
                    "chmod go-w, and chown root");
  } else {
    diagnosis.Good("socket of " + Shown(api) + " " + Shown(path));
  }
}

/// @return whether the file and what it names are in order
void lookAtDescription(const std::string& path, Diagnosis& diagnosis) {
  const int before = diagnosis.Count();
  DescriptionText text;
  const std::string fault = text.ReadFile(path);
  if (!fault.empty()) {
    return diagnosis.Wrong(fault, "its APIs answer 102");
  }
  if (OthersMayChange(path)) {
    return diagnosis.Wrong("others may write " + Shown(path) + ", so it is not read",
                           "chmod go-w " + Shown(path) + ", and chown root");
  }
  const Json::Value& root = text.Root();
  for (auto it = root.begin(); root.isObject() && it != root.end(); ++it) {
    const std::string wrong = APIDescription(*it).Fault();
    if (!wrong.empty()) {
      diagnosis.Wrong(Shown(path) + ": " + Shown(it.name()) + ": " + Shown(wrong),
                      "webapi check " + Shown(path));
      continue;
    }
    lookAtLibrary(it.name(), *it, diagnosis);
    lookAtSocket(it.name(), *it, diagnosis);
  }
  if (diagnosis.Count() == before) {
    diagnosis.Good("description " + Shown(path));
  }
}

}  // namespace

void LookAtAccounts(Diagnosis& diagnosis) {
  uid_t uid = 0;
  gid_t gid = 0;
  if (QELOUserGetUGID("system", &uid, &gid) == 0) {
    diagnosis.Good("account system, which methods run as: user " + std::to_string(uid) +
                   ", group " + std::to_string(gid));
  } else {
    diagnosis.Wrong("there is no account system, and calls answer 117",
                    "useradd --system --user-group --no-create-home --home-dir /nonexistent "
                    "--shell /usr/sbin/nologin system");
  }
  const std::string administrators = Platform::Settings().Get("admin_group", "administrators");
  if (hasGroup(administrators)) {
    diagnosis.Good("group " + Shown(administrators) + ", the administrators");
  } else {
    diagnosis.Wrong("there is no group " + Shown(administrators) + ", so nobody is administrator",
                    "groupadd --system " + Shown(administrators));
  }
  if (kIsHost && access("/etc/pam.d/webapi", F_OK) != 0) {
    diagnosis.Note("/etc/pam.d/webapi is not there, so PAM's service \"other\" checks passwords");
  }
}

void LookAtPlaces(Diagnosis& diagnosis) {
  const Place places[] = {
      {Paths::kDescriptionDir, 0755, true, Missing::kWrong, "directory of descriptions"},
      {Paths::kLibDef, 0644, false, Missing::kWrong, "defaults of descriptions"},
      {Paths::kTaskDir, 01733, true, Missing::kWrong, "directory of tasks"},
      {Paths::kStateDir, 0755, true, Missing::kWrong, "directory of records"},
      {Paths::kTokenDatabase, 0600, false, Missing::kMadeLater, "access tokens"},
      {Paths::kSharingDatabase, 0600, false, Missing::kMadeLater, "sharing links"},
      {Paths::kRuntimeDir, 0755, true, Missing::kMadeLater, "directory of the running system"},
      {Paths::kSessionDir, 0700, true, Missing::kMadeLater, "login sessions"},
      {Paths::kLoginDir, 0700, true, Missing::kMadeLater, "login attempts"},
      {Paths::kSystemInfo, 0644, false, Missing::kLeftOut, "settings"},
      {Paths::kCipherKey, 0600, false, Missing::kLeftOut, "key of enciphered parameters"},
      {Paths::kRelayHosts, 0600, false, Missing::kLeftOut, "hosts that calls are passed to"},
  };
  for (const Place& place : places) {
    LookAtPlace(place, diagnosis);
  }
}

void LookAtDescriptions(Diagnosis& diagnosis) {
  glob_t files{};
  const std::string pattern = std::string(Paths::kDescriptionDir) + "*.lib";
  if (glob(pattern.c_str(), 0, nullptr, &files) != 0) {
    diagnosis.Wrong("there are no descriptions in " + std::string(Paths::kDescriptionDir),
                    "install again");
  }
  for (size_t i = 0; i < files.gl_pathc && i < kMostFiles; ++i) {
    lookAtDescription(files.gl_pathv[i], diagnosis);
  }
  globfree(&files);
}

}  // namespace QELO::AuthorProgram
