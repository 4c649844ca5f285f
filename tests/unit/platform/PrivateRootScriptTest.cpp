#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>

#include "tests/unit/platform/PrivateRoot.h"

namespace {

namespace fs = std::filesystem;

/// packaging/private-root, run on a directory within a private root.
class PrivateRootScript : public PrivateRoot {
 protected:
  static int Run(const std::string& arguments) {
    const std::string command = std::string(PRIVATE_ROOT_SCRIPT) + " " + arguments + " > '" +
                                Path("var/output") + "' 2> '" + Path("var/messages") + "'";
    const int status = system(command.c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
  static std::string Root() { return Path("var/new root"); }
  static int Make(const std::string& options = "") { return Run("'" + Root() + "' " + options); }
};

TEST_F(PrivateRootScript, TellsTheAccounts) {
  EXPECT_EQ(Make(), 0);
  EXPECT_EQ(Read("var/output"),
            "  admin  admin-pw  administrator\n  alice  alice-pw\n  bob    bob-pw\n");
  EXPECT_EQ(Read("var/messages"), "");
}

TEST_F(PrivateRootScript, SecretsAreForTheirOwnerAlone) {
  EXPECT_EQ(Make(), 0);
  EXPECT_EQ(Status("var/new root/etc/shadow").st_mode, S_IFREG | 0600U);
  EXPECT_EQ(Status("var/new root/run/webapi/sessions").st_mode, S_IFDIR | 0700U);
  EXPECT_EQ(Status("var/new root/run/webapi/logins").st_mode, S_IFDIR | 0700U);
  EXPECT_EQ(Status("var/new root/home/alice").st_mode, S_IFDIR | 0700U);
}

TEST_F(PrivateRootScript, TaskStoresOfRootAndTheWorkingAccountHaveTheirPlaces) {
  EXPECT_EQ(Make(), 0);
  for (const uid_t user : {0U, 900U}) {
    const uid_t owner = IsRoot() ? user : geteuid();
    const std::string place = "var/new root/var/lib/webapi/tasks/" + std::to_string(owner);
    EXPECT_EQ(Status(place).st_mode, S_IFDIR | 0700U);
    EXPECT_EQ(Status(place).st_uid, owner);
  }
}

TEST_F(PrivateRootScript, SecondRunKeepsSessionsAndSettings) {
  EXPECT_EQ(Make(), 0);
  Write("var/new root/run/webapi/sessions/kept", "session");
  Write("var/new root/etc/qeloinfo.conf", "language=ger\n");
  Write("var/new root/etc/group", "");
  EXPECT_EQ(Make(), 0);
  EXPECT_EQ(Read("var/new root/run/webapi/sessions/kept"), "session");
  EXPECT_EQ(Read("var/new root/etc/qeloinfo.conf"), "language=ger\n");
  EXPECT_NE(Read("var/new root/etc/group").find("administrators:"), std::string::npos);
}

TEST_F(PrivateRootScript, DescriptionsAreCopiedAndOtherFilesAreNot) {
  fs::create_directory(Path("var/descriptions"));
  Write("var/descriptions/QELO.X.lib", "{}");
  Write("var/descriptions/lib.def", "{\"a\":1}");
  Write("var/descriptions/notes.txt", "");
  EXPECT_EQ(Make("--description-dir '" + Path("var/descriptions") + "'"), 0);
  const std::string target = "var/new root/usr/qelo/qeloman/webapi/";
  EXPECT_EQ(Read(target + "QELO.X.lib"), "{}");
  EXPECT_EQ(Read(target + "lib.def"), "{\"a\":1}");
  EXPECT_EQ(Status(target + "QELO.X.lib").st_mode, S_IFREG | 0644U);
  EXPECT_EQ(CountFiles(target), 2);
}

TEST_F(PrivateRootScript, AdministratorsAreNotTheGroupOfEverybody) {
  EXPECT_EQ(Make(), 0);
  const std::string groups = Read("var/new root/etc/group");
  EXPECT_EQ(groups.find("administrators:x:" + std::to_string(getegid()) + ":"), std::string::npos);
}

TEST_F(PrivateRootScript, SystemThatIsNoPrivateRootIsLeftAlone) {
  fs::create_directories(Root() + "/etc");
  Write("var/new root/etc/passwd", "somebody");
  EXPECT_EQ(Make(), 1);
  EXPECT_EQ(Read("var/messages"), Root() + " holds a system of its own; nothing was changed\n");
  EXPECT_EQ(Read("var/new root/etc/passwd"), "somebody");
  EXPECT_EQ(CountFiles("var/new root"), 1);
}

TEST_F(PrivateRootScript, MissingDescriptionsAreNamedAndNothingIsMade) {
  EXPECT_EQ(Make("--description-dir /nonexistent"), 1);
  EXPECT_EQ(Read("var/messages"), "/nonexistent is no directory\n");
  EXPECT_FALSE(fs::exists(Root()));
}

TEST_F(PrivateRootScript, WrongUseTellsTheUse) {
  for (const char* arguments : {"", "''", "one two", "--nonsense", "one --description-dir"}) {
    EXPECT_EQ(Run(arguments), 2) << arguments;
    EXPECT_NE(Read("var/messages").find("Usage: packaging/private-root DIR"), std::string::npos);
  }
}

}  // namespace
