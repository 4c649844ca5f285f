#pragma once

#include <json/json.h>
#include <sys/types.h>

#include <ctime>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "webapi/testing/TestAnswer.h"

namespace QELO {

/// A made-up host that a test calls its API on: in process, without a web server, root's rights or
/// anything installed.
///
///     TEST(People, AreFoundByName) {
///       QELO::TestHost host;
///       host.Describe(SOURCE_DIR "/QELO.Example.People.lib");
///       host.AddUser("alice", 1001);
///       host.LogIn("alice");
///       const auto answer = host.Call("QELO.Example.People", 1, "find", {{"name", "Ann"}});
///       EXPECT_TRUE(answer.IsSuccess()) << answer;
///       EXPECT_EQ(answer.account, "alice");
///     }
///
/// The test program is linked with the API's own sources and `webapi::testing` in place of
/// `webapi::webapi`. A call goes the whole road of a request, from the parameter line by the
/// description, the caller's rights and GetAPITable() to header lines and body. What the host does
/// on that road is made up: accounts, sessions, credentials, uploads, the clock of the day, the
/// records of background tasks, syslog. The program's own geteuid(), setresuid(), time(), syslog()
/// and their like tell it; files and all else are real, with the rights of who runs the test.
///
/// There is one at a time.
class TestHost {
 public:
  using Params = std::vector<std::pair<std::string, Json::Value>>;

  /// Knows the accounts "root" and "system", which methods run as unless told otherwise. Nobody is
  /// logged in; the clock is the real one.
  TestHost();
  TestHost(const TestHost&) = delete;
  TestHost& operator=(const TestHost&) = delete;
  /// Ends background tasks that still run and removes Directory().
  ~TestHost();

  /// Takes the APIs of a description file, NAME.lib, also one with words such as
  /// "@webapi_API_DIR@" still in it: "lib" is not looked at.
  /// @return false when it is not to be read, or no JSON
  bool Describe(const std::string& file);
  /// Takes one API's description.
  void Describe(const std::string& api, const Json::Value& description);

  /// An account; its group has the same number. Administrators are members of "administrators".
  void AddUser(const std::string& name, uid_t uid, bool isAdmin = false);
  /// The calls that follow come by a session of this user, from this address.
  void LogIn(const std::string& user, const std::string& address = "192.0.2.7");
  /// The calls that follow are nobody's.
  void LogOut();
  /// Whether users have the application privilege that a description names; true at first.
  void SetAppPrivilege(bool isHeld);

  /// The next call brings a file, as this field of a form. For methods that are called when all has
  /// arrived: not for "deferUpload".
  /// @param name  at the client's
  void AddUpload(const std::string& field, const std::string& name, const std::string& content);
  /// A CGI variable of all calls that follow, as "HTTP_USER_AGENT".
  void SetVariable(const std::string& name, const std::string& value);
  /// Stops the clock of the day at a time; 0 lets it go on as the real one.
  void SetClock(time_t now);

  /// A call with parameters as JSON values, sent by POST as careful clients send them.
  TestAnswer Call(const std::string& api, int version, const std::string& method,
                  const Params& params = {});
  /// A call with parameters as they are on the wire: "name=Ann&phone=12345".
  TestAnswer CallLine(const std::string& api, int version, const std::string& method,
                      const std::string& line);

  /// Waits until a background task has ended, for 10 seconds at most.
  /// @param fullId  the "task_id" of the call's data
  /// @return the body that its work set last; null when there is none, or it goes on
  Json::Value WaitForTask(const std::string& fullId);
  /// The next task cannot be started: no process can be made.
  void RefuseProcesses(bool areRefused);

  /// What was logged since the test began, a line each, background work's too.
  std::vector<std::string> Log() const;
  /// Whether a line holds this text.
  bool HasLogged(const std::string& text) const;

  /// A directory of the test's own.
  const std::string& Directory() const;
  /// Where a user's APIRequest::GetPreferenceDir() is.
  std::string PreferenceDirectory(const std::string& user) const;

 private:
  struct State;
  std::unique_ptr<State> state_;
};

}  // namespace QELO
