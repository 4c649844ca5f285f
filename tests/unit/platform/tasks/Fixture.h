#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Task.h"

/// A private root with the module of task records and no stores yet.
class TaskTest : public PrivateRoot {
 protected:
  static constexpr uid_t kSystem = 900;
  static constexpr uid_t kAdmin = 1001;
  static constexpr uid_t kAlice = 1002;
  static constexpr uid_t kBob = 1003;

  void SetUp() override;

  /// The store's directory, and what is in it.
  static std::string Store(uid_t user, const std::string& file = "");
  /// Runs SQL on a store's database. @return the first column of the rows, joined with ","
  static std::string Sql(uid_t user, const std::string& sql);
  static std::string Sql(const std::string& sql) { return Sql(geteuid(), sql); }

  /// A new id of the effective user's.
  static std::string NewId(const std::string& prefix = "t_");
  /// The id of a new record of the owner's with the property "body" {"n": 1}.
  static std::string NewTask(const std::string& owner, const std::string& prefix = "t_");
  static Json::Value Number(int n);
  static int NumberOf(const Json::Value& value);

  /// Runs in a forked child that has become the user for good. @return as InChild()
  static int As(uid_t user, const std::function<int()>& body);
  /// As the user, what the function makes; "" when it fails.
  static std::string TextFrom(uid_t user, const std::function<std::string()>& make);

  /// A child that runs the body and then sleeps until it is killed.
  /// @return its id once the body has run
  static pid_t StartSleeper(const std::function<void()>& body = [] {});
  /// Kills with SIGKILL and waits for the end.
  static void Kill(pid_t child);
};

/// The same for tests that need users of their own, which root alone can become.
class TaskUserTest : public TaskTest {
 protected:
  void SetUp() override;
};
