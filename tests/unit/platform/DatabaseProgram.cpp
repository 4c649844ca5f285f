#include "tests/unit/platform/DatabaseProgram.h"

#include <sqlite3.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

void run(const std::string& path, const std::string& sql, int end) {
  sqlite3* database = nullptr;
  const bool done = sqlite3_open(path.c_str(), &database) == SQLITE_OK &&
                    sqlite3_busy_timeout(database, 5000) == SQLITE_OK &&
                    sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
  const std::string error = done ? "." : sqlite3_errmsg(database);
  char byte = 0;
  if (send(end, error.c_str(), error.size(), 0) > 0 && recv(end, &byte, 1, 0) >= 0) {
    sqlite3_close(database);
  }
}

}  // namespace

DatabaseProgram::DatabaseProgram(const std::string& path, const std::string& sql) {
  int ends[2] = {-1, -1};
  EXPECT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends), 0);
  child_ = fork();
  if (child_ == 0) {
    close(ends[0]);
    run(path, sql, ends[1]);
    _exit(0);
  }
  close(ends[1]);
  end_ = ends[0];
  char text[256];
  const ssize_t size = recv(end_, text, sizeof text, 0);
  error_ = size > 0 ? std::string(text, static_cast<size_t>(size)) : "it did not answer";
  error_ = error_ == "." ? "" : error_;
}

DatabaseProgram::~DatabaseProgram() {
  close(end_);
  waitpid(child_, nullptr, 0);
}

std::string runSql(const std::string& path, const std::string& sql) {
  return DatabaseProgram(path, sql).Error();
}
