#pragma once

#include <sys/types.h>

#include <string>

/// Another program at a database: a process of its own, since SQLite takes no notice of the locks
/// of its own process that a second copy of it holds.
class DatabaseProgram {
 public:
  /// Runs SQL and stays, in a transaction maybe, until this object's end.
  DatabaseProgram(const std::string& path, const std::string& sql);
  ~DatabaseProgram();
  DatabaseProgram(const DatabaseProgram&) = delete;
  DatabaseProgram& operator=(const DatabaseProgram&) = delete;

  /// What went wrong; "": nothing.
  const std::string& Error() const { return error_; }

 private:
  pid_t child_;
  int end_ = -1;  ///< closed for the program to end
  std::string error_;
};

/// Runs SQL. @return what went wrong; "": nothing
std::string runSql(const std::string& path, const std::string& sql);
