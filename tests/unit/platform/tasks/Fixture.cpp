#include "tests/unit/platform/tasks/Fixture.h"

#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>

#include "platform/base/Paths.h"
#include "tests/unit/platform/BuiltModules.h"
#include "webapi/JsonHelper.h"

namespace fs = std::filesystem;
using namespace QELO;

void TaskTest::SetUp() {
  PrivateRoot::SetUp();
  fs::copy_file(fs::path(kBuiltModuleDir) / "tasks.so", fs::path(Path("modules")) / "tasks.so",
                fs::copy_options::overwrite_existing);
  fs::remove_all(Paths::kTaskDir);  // the places that root and the working account have there
  fs::create_directories(Paths::kTaskDir);
  ASSERT_EQ(chmod(Paths::kTaskDir, 01733), 0);
}

void TaskUserTest::SetUp() {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root can become other users";
  }
  TaskTest::SetUp();
}

std::string TaskTest::Store(uid_t user, const std::string& file) {
  return std::string(Paths::kTaskDir) + "/" + std::to_string(user) +
         (file.empty() ? "" : "/" + file);
}

std::string TaskTest::Sql(uid_t user, const std::string& sql) {
  std::string result;
  sqlite3* database = nullptr;
  const auto add = [](void* text, int, char** values, char**) {
    std::string& joined = *static_cast<std::string*>(text);
    joined += (joined.empty() ? "" : ",") + std::string(values[0] != nullptr ? values[0] : "null");
    return 0;
  };
  char* error = nullptr;
  EXPECT_EQ(
      sqlite3_open_v2(Store(user, "tasks.db").c_str(), &database, SQLITE_OPEN_READWRITE, nullptr),
      SQLITE_OK);
  sqlite3_busy_timeout(database, 5000);
  sqlite3_db_config(database, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), add, &result, &error), SQLITE_OK) << error;
  sqlite3_free(error);
  sqlite3_close(database);
  return result;
}

std::string TaskTest::NewId(const std::string& prefix) {
  return ARDO::TaskUtil::getUniqueID("", prefix);
}

std::string TaskTest::NewTask(const std::string& owner, const std::string& prefix) {
  const std::string id = ARDO::TaskUtil::getUniqueID(owner, prefix);
  return ARDO::Task(owner, id).setProperty("body", Number(1)) ? id : "";
}

Json::Value TaskTest::Number(int n) {
  Json::Value value;
  value["n"] = n;
  return value;
}

int TaskTest::NumberOf(const Json::Value& value) {
  return JsonHelper::asInt(JsonHelper::member(value, "n"), -1);
}

int TaskTest::As(uid_t user, const std::function<int()>& body) {
  return InChild([&] {
    if (user != geteuid() && (setgroups(0, nullptr) != 0 || setresgid(user, user, user) != 0 ||
                              setresuid(user, user, user) != 0)) {
      return 98;
    }
    return body();
  });
}

std::string TaskTest::TextFrom(uid_t user, const std::function<std::string()>& make) {
  int ends[2];
  EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
  EXPECT_EQ(As(user,
               [&] {
                 const std::string text = make();
                 return write(ends[1], text.data(), text.size()) ==
                                static_cast<ssize_t>(text.size())
                            ? 0
                            : 97;
               }),
            0);
  close(ends[1]);
  std::string text(4096, '\0');
  const ssize_t size = read(ends[0], text.data(), text.size());
  close(ends[0]);
  text.resize(size > 0 ? static_cast<size_t>(size) : 0);
  return text;
}

pid_t TaskTest::StartSleeper(const std::function<void()>& body) {
  int ends[2];
  EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const pid_t child = fork();
  if (child == 0) {
    body();
    if (write(ends[1], "x", 1) == 1) {
      pause();
    }
    _exit(0);
  }
  char byte = 0;
  close(ends[1]);
  EXPECT_EQ(read(ends[0], &byte, 1), 1);
  close(ends[0]);
  return child;
}

void TaskTest::Kill(pid_t child) {
  EXPECT_EQ(kill(child, SIGKILL), 0);
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}
