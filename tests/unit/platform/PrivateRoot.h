#pragma once

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <functional>
#include <map>
#include <string>

/// A private root as packaging/private-root makes it, fresh for every test: no sessions, no counted
/// logins, no tokens, the script's accounts and settings, the modules in place, and an environment
/// without CGI variables.
class PrivateRoot : public testing::Test {
 protected:
  static constexpr char kAddress[] = "192.0.2.7";

  void SetUp() override;

  /// Absolute path of something in the root; `relative` starts without "/".
  static std::string Path(const std::string& relative = "");
  static std::string Read(const std::string& relative);
  static void Write(const std::string& relative, const std::string& text, mode_t mode = 0600);
  /// Replaces qeloinfo.conf.
  static void Set(const std::map<std::string, std::string>& settings);
  /// Gives an account of the script other fields in the shadow file, from the hash on; "" takes its
  /// line away.
  static void SetShadow(const std::string& account, const std::string& fields);
  /// Gives an account of the script another line in the account file; "" takes it away.
  static void SetAccount(const std::string& account, const std::string& line);
  static long Today();
  /// Sets a file's times so many seconds back.
  static void Age(const std::string& relative, long seconds);
  static struct stat Status(const std::string& relative);
  static int CountFiles(const std::string& relative);

  static bool IsRoot();
  /// Runs in a forked child. @return its exit status, -1 when it did not end by itself
  static int InChild(const std::function<int()>& body);
};
