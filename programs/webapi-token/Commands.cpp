#include "programs/webapi-token/Commands.h"

#include <fcntl.h>
#include <json/json.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <map>

#include "platform/base/IpAddress.h"
#include "platform/base/Paths.h"
#include "platform/tokens/module/TokenStore.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/DescriptionFile.h"
#include "webapi/base/Number.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::TokenProgram {
namespace {

using Platform::TokenStore;

constexpr int kDefaultDays = 90;
constexpr int kMostDays = 36500;
constexpr int64_t kDaySeconds = 86400;
constexpr mode_t kStateDirMode = 0711;  // the groups' directories stand there too

constexpr char kHelp[] =
    "Access tokens stand for a user in API calls. A call sends its token as the parameter "
    "tid=TOKEN,\n"
    "instead of a login. The commands need root's rights.\n"
    "\n"
    "webapi-token create --user USER [--api API] [--method METHOD] [--days N] [--name NAME]\n"
    "                    [--address NETWORK] [--read-only] [--service]\n"
    "    Makes a token and prints it, this once: only a hash of it is kept.\n"
    "    --api, --method  the API or method that it is for; \"QELO.Host.*\": all that begin so; "
    "\"*\",\n"
    "                     the default: all\n"
    "    --name           what it is for, as the list shows it\n"
    "    --address        the address or network, as 192.0.2.0/24, that it may be used from\n"
    "    --read-only      for methods alone whose description says \"readOnly\"\n"
    "    --days           how long it is good, 90 when not given; 0: for ever\n"
    "    --service        for an account that nobody logs in to; such a token stays good while "
    "the\n"
    "                     account is locked or has no shell, until the account expires or is gone\n"
    "webapi-token list\n"
    "    Lists the tokens, below a line of headings; columns end with a tab.\n"
    "webapi-token revoke ID\n"
    "    Removes the token with this number.\n"
    "webapi-token --help, -h\n";

struct Streams {
  FILE* output;
  FILE* messages;
};

ExitCode wrongUse(const Streams& streams, const std::string& reason) {
  fprintf(streams.messages, "webapi-token: %s; see webapi-token --help\n", reason.c_str());
  return kWrongUse;
}

ExitCode failed(const Streams& streams, const std::string& reason) {
  fprintf(streams.messages, "webapi-token: %s\n", reason.c_str());
  return kFailed;
}

template <typename T>
bool parse(const std::string& text, T lowest, T highest, T& number) {
  return ParseNumber(text, number) && number >= lowest && number <= highest;
}

/// Whether the database, or the directory that is to have it, is another account's.
bool lacksRights(const TokenStore& store) {
  const char* path = store.Missing() ? Paths::kStateDir : Paths::kTokenDatabase;
  return faccessat(AT_FDCWD, path, R_OK | W_OK, AT_EACCESS) != 0 && errno == EACCES;
}

std::string databaseError(const TokenStore& store) {
  return std::string(Paths::kTokenDatabase) + ": " + store.Error() +
         (lacksRights(store) ? "; root's rights are needed" : "");
}

/// Whether calls find a description of this API.
bool isDescribed(const std::string& api) {
  const std::string directory = Paths::kDescriptionDir;
  const std::string file = DescriptionFile(api, [&](const std::string& name) {
    return QLIBCFileExist((directory + name).c_str()) == 1;
  });
  Json::Value descriptions;
  return !file.empty() && WebAPIUtil::ReadJsonFile(directory + file, descriptions) &&
         JsonHelper::hasMember(descriptions, api);
}

std::string timeText(int64_t seconds) {
  const time_t when = seconds;
  tm parts{};
  char text[32] = "";
  gmtime_r(&when, &parts);
  strftime(text, sizeof text, "%Y-%m-%d %H:%M", &parts);
  return seconds == 0 ? "never" : text;
}

/// A name, its beginning and a "*", or "*".
bool isPattern(const std::string& text) {
  const std::string name = text.substr(0, text.size() - (text.ends_with('*') ? 1 : 0));
  return !text.empty() && name.find_first_of("* \t\r\n") == std::string::npos;
}

/// The list is taken apart by tabs and lines.
bool isName(const std::string& text) {
  return std::none_of(text.begin(), text.end(),
                      [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

bool isNetwork(const std::string& text) {
  bool valid = false;
  Platform::IpAddress().IsIn(text, valid);
  return text.empty() || valid;
}

/// Reads "--name value" pairs. @return what is wrong, or ""
std::string readOptions(const std::vector<std::string>& arguments,
                        std::map<std::string, std::string>& options) {
  for (size_t i = 1; i < arguments.size(); i += 2) {
    const auto option = options.find(arguments[i]);
    if (option == options.end()) {
      return arguments[i] + " is no option of create";
    }
    if (i + 1 == arguments.size()) {
      return arguments[i] + " needs a value";
    }
    option->second = arguments[i + 1];
  }
  return "";
}

/// Takes an option without a value out. @return whether it was there
bool takeFlag(std::vector<std::string>& arguments, const char* flag) {
  const auto end = std::remove(arguments.begin(), arguments.end(), flag);
  const bool found = end != arguments.end();
  arguments.erase(end, arguments.end());
  return found;
}

uid_t uidOf(const char* user) {
  uid_t uid = 0;
  gid_t gid = 0;
  return QELOUserGetUGID(user, &uid, &gid) == 0 ? uid : TokenStore::kNobody;
}

/// Completes the owner by the account's id. @return what speaks against a token for it, or ""
std::string readOwner(TokenStore::Owner& owner) {
  const char* found = QELOUserStandingGet(owner.user.c_str());
  if (found == nullptr) {
    return "there is no user " + owner.user;
  }
  owner.uid = uidOf(owner.user.c_str());
  const std::string standing = found;
  // An account file that cannot be read says that the caller has not the rights, as the database
  // will.
  if (standing == "good" || standing == "not readable") {
    return "";
  }
  const std::string refusal = "the account " + owner.user + " is " + standing;
  if (standing == "expired") {
    return refusal;
  }
  return owner.isService ? "" : refusal + "; --service makes a token for such an account";
}

/// Reads what the new token is to be. @return what is wrong with the call, or ""
std::string readEntry(std::vector<std::string> arguments, TokenStore::Entry& entry) {
  std::map<std::string, std::string> options = {
      {"--user", ""}, {"--api", "*"},   {"--method", "*"}, {"--days", std::to_string(kDefaultDays)},
      {"--name", ""}, {"--address", ""}};
  entry.owner.isService = takeFlag(arguments, "--service");
  entry.readOnly = takeFlag(arguments, "--read-only");
  const std::string wrong = readOptions(arguments, options);
  int days = 0;
  if (!wrong.empty()) {
    return wrong;
  }
  if (options["--user"].empty()) {
    return "--user is missing";
  }
  if (!isPattern(options["--api"]) || !isPattern(options["--method"])) {
    return "--api and --method take a whole name, its beginning and \"*\", or \"*\" for all";
  }
  if (!isName(options["--name"])) {
    return "--name takes a line of text";
  }
  if (!isNetwork(options["--address"])) {
    return "--address takes an address or a network";
  }
  if (!parse(options["--days"], 0, kMostDays, days)) {
    return "--days takes a number from 0 to " + std::to_string(kMostDays);
  }
  entry.owner.user = options["--user"];
  entry.scopes = {{options["--api"], options["--method"]}};
  entry.name = options["--name"];
  entry.address = options["--address"];
  entry.expires = days == 0 ? 0 : time(nullptr) + days * kDaySeconds;
  return "";
}

ExitCode create(const std::vector<std::string>& arguments, const Streams& streams) {
  TokenStore::Entry entry;
  const std::string wrong = readEntry(arguments, entry);
  if (!wrong.empty()) {
    return wrongUse(streams, wrong);
  }
  const std::string refusal = readOwner(entry.owner);
  if (!refusal.empty()) {
    return failed(streams, refusal);
  }
  const std::string& api = entry.scopes[0].api;
  if (!api.ends_with('*') && !isDescribed(api)) {
    fprintf(streams.messages, "webapi-token: there is no API %s; the token is made all the same\n",
            api.c_str());
  }
  QELOFSMkdirP(Paths::kStateDir, 1, 0, static_cast<uid_t>(-1), static_cast<gid_t>(-1),
               kStateDirMode);
  TokenStore store;
  std::string token;
  if (!store.Open(Paths::kTokenDatabase, true, uidOf) || !store.Create(entry, token)) {
    return failed(streams, databaseError(store));
  }
  fprintf(streams.output, "%s\n", token.c_str());
  fprintf(streams.messages, "Token %lld of %s, good until: %s. It is not shown again.\n",
          static_cast<long long>(entry.id), entry.owner.user.c_str(),
          timeText(entry.expires).c_str());
  return kDone;
}

void printEntry(const TokenStore::Entry& entry, const Streams& streams) {
  std::string apis;
  std::string methods;
  for (const TokenStore::Scope& scope : entry.scopes) {
    apis += (apis.empty() ? "" : ",") + scope.api;
    methods += (methods.empty() ? "" : ",") + scope.method;
  }
  const std::string limits = std::string(entry.readOnly ? "read-only" : "") +
                             (entry.readOnly && !entry.address.empty() ? " " : "") + entry.address;
  fprintf(streams.output, "%lld\t%s\t%s\t%s\t%s\t%s\t%s\t%s\t%s\n",
          static_cast<long long>(entry.id),
          (entry.owner.user + (entry.owner.isService ? " (service)" : "")).c_str(), apis.c_str(),
          methods.c_str(), timeText(entry.created).c_str(), timeText(entry.expires).c_str(),
          timeText(entry.used).c_str(), limits.c_str(), entry.name.c_str());
}

ExitCode list(const Streams& streams) {
  TokenStore store;
  std::vector<TokenStore::Entry> entries;
  const bool opened = store.Open(Paths::kTokenDatabase, false, uidOf);
  if ((!opened && !store.Missing()) || (opened && !store.List(nullptr, entries))) {
    return failed(streams, databaseError(store));
  }
  fprintf(streams.output,
          "ID\tUSER\tAPI\tMETHOD\tMADE (UTC)\tGOOD UNTIL (UTC)\tLAST USE (UTC)\tLIMITS\tNAME\n");
  for (const TokenStore::Entry& entry : entries) {
    printEntry(entry, streams);
  }
  return kDone;
}

ExitCode revoke(const std::string& number, const Streams& streams) {
  int64_t id = 0;
  if (!parse<int64_t>(number, 1, INT64_MAX, id)) {
    return wrongUse(streams, "revoke takes the number of a token");
  }
  TokenStore store;
  bool found = false;
  const bool opened = store.Open(Paths::kTokenDatabase, false, uidOf);
  if ((!opened && !store.Missing()) || (opened && !store.Revoke(id, nullptr, found))) {
    return failed(streams, databaseError(store));
  }
  return found ? kDone : failed(streams, "there is no token " + number);
}

}  // namespace

ExitCode run(const std::vector<std::string>& arguments, FILE* output, FILE* messages) {
  const Streams streams{output, messages};
  const std::string command = arguments.empty() ? "" : arguments[0];
  if (std::any_of(arguments.begin(), arguments.end(), [](const std::string& argument) {
        return argument == "--help" || argument == "-h";
      })) {
    fputs(kHelp, output);
    return kDone;
  }
  if (command == "create") {
    return create(arguments, streams);
  }
  if (command == "list" && arguments.size() == 1) {
    return list(streams);
  }
  if (command == "revoke" && arguments.size() == 2) {
    return revoke(arguments[1], streams);
  }
  return wrongUse(streams, command.empty() ? "a command is missing" : "wrong command");
}

}  // namespace QELO::TokenProgram
