#pragma once

#include <sys/types.h>

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "tests/support/FakeUpload.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Sharing.h"

/// The host's operations as unit tests want them: each answers what its field says, and the calls
/// that matter are recorded. Linked in place of the embedded platform.
struct FakePlatform {
  /// The one in use; a fresh one for every test that calls Reset().
  static FakePlatform& Get();
  static FakePlatform& Reset();

  std::vector<std::string> calls;  ///< "Operation(argument, ...)" in order

  // Core library
  std::map<std::string, std::string> settings;  ///< key of qeloinfo.conf: value
  int lockResult = 0;
  int mkdirResult = 0;
  pid_t forkResult = -2;  ///< -2: really fork
  int forksLeft = -1;     ///< after so many really made forks the next fail; -1: no limit
  std::function<int(const std::string&, uid_t*, gid_t*)> userGetUGID;
  int isAdmin = 0;
  int appPriv = 1;
  std::string preferenceDir = "/fake/preferences";  ///< "": the look-up fails
  int preferenceResult = 1;                         ///< result of a look-up that finds it
  int timeoutSetting = 900;
  int compoundEntries = 1024;
  int compoundEntriesAnonymous = 256;
  QLIBCTransferLimits bodyLimits{256, 60, 604800};
  std::function<int(const std::string&, const std::string&)> setKeyValue;  ///< unset: 0

  // Names and addresses of the network: what each check answers.
  int hostname = 0;
  int domain = 0;
  int addressType = 0;

  // CGI library. A context that QeloCgiInit started has the language "enu", no session and no
  // options until it takes the cookies; any other has what stands here.
  std::string language = "enu";
  int cgiInitEx = 1;
  int tokenEnable = 0;
  std::string remoteAddress = "192.0.2.7";  ///< "": not known
  int authorized = -2;                      ///< result of QeloCgiIsAuthorizedEx
  std::string authorizedUser;
  std::map<std::string, std::string> options;
  unsigned int uid = 1000;
  std::string loadedCookies;  ///< HTTP_COOKIE at the last QeloCgiLoadInCookies
  int detectResult = 1;
  std::function<int(char*)> decryptParam;
  std::string publicKey;  ///< of QeloCgiGetPublicKey(); "": there is none

  // Credentials and tokens
  bool credentialResult = true;
  /// What a switch of credentials does; unset: nothing, with credentialResult as its result.
  std::function<bool(const std::string& name, bool keepPrivilege)> resetCredentials;
  int tokenGrant = -1;
  std::string tokenUser;
  int aesKeyResult = -1;
  int tokenWork = 0;  ///< what becomes of making, listing and revoking tokens
  std::function<bool(const std::string&, const std::string&, std::string&)> decryptAES;

  std::string keptVariable;  ///< the one that a setting adds to the environment

  // Connections to daemons: what each step answers, and the reply. Sent messages are recorded
  // whole.
  bool daemonConnects = true;
  bool daemonSends = true;
  bool daemonAnswers = true;
  std::string daemonReply;
  std::string daemonMessage;

  // Login service
  int loginAttempt = 0;
  int passwordCheck = 0;
  int sessionCreate = 0;
  int sessionRemove = 0;
  int sessionRefresh = 0;
  long secondsLeft = 900;

  // Sharing
  bool sharingGood = false;
  bool sharingUrlKnown = true;  ///< false: the look-up fails, with an empty address
  std::optional<QELO::sharing::record::Entry> sharingEntry;  ///< none: is not found
  std::optional<QELO::sharing::record::Session> sharingSession;
  int sharingAuthorized = -2;
  /// What a switch to the credentials of a file does; unset: nothing, with credentialResult.
  std::function<bool(const std::string& path, bool keepPrivilege)> executableCredentials;
  std::map<uid_t, std::string> users;  ///< by id, for QELOUserGetByUID

  // Calls of other hosts: the index that queueing gives, what becomes of them.
  int relayIndex = 0;
  bool relayRuns = true;
  int relayError = 0;
  std::string relayAnswer;
  std::string relayBody;  ///< what an upload's stream gave

  // Web server
  bool engineThrows = false;

  // File output
  int fileOutput = 0;      ///< result of each output
  bool fastOutput = true;  ///< the switch

  bool readsSchemas = true;  ///< the host has a reader of schemas

  FakeUpload upload;
};
