#include <fcntl.h>

#include <algorithm>
#include <string_view>
#include <utility>

#include "platform/accounts/AccountDatabase.h"
#include "platform/base/KnownFile.h"
#include "platform/base/Paths.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {
namespace {

constexpr size_t kLargestFile = 1 << 26;  // bytes; a larger one is not read

/// The text of an account file. Lines are taken apart when they are asked for: a call wants one
/// account and one group, and making objects of all of them cost as much as the rest of its
/// look-up.
struct EntryFile {
  EntryFile() = default;
  explicit EntryFile(const char* path) {
    UniqueFd file;
    struct stat info {};
    readable = OpenRegularFile(AT_FDCWD, path, file, info, 0) == 0 &&
               ReadText(file.Get(), kLargestFile, text);
    text.resize(readable ? text.size() : 0);
  }

  bool readable = false;
  std::string text;
};

std::shared_ptr<const EntryFile> accounts() {
  static KnownFile<EntryFile> file(Paths::kPasswd);
  return file.Get();
}

std::shared_ptr<const EntryFile> groups() {
  static KnownFile<EntryFile> file(Paths::kGroup);
  return file.Get();
}

/// Calls `visit` with the name and the rest of each line that can be an entry.
/// @return whether `visit` returned true, which ends the reading
template <typename Visit>
bool anyLine(const EntryFile& file, Visit visit) {
  for (std::string_view rest = file.text; !rest.empty();) {
    std::string_view line = TakePiece(rest, "\n");
    line.remove_prefix(std::min(line.find_first_not_of(" \t"), line.size()));
    if (line.empty() || line.front() == '#') {
      continue;
    }
    const std::string_view name = TakePiece(line, ":");
    if (visit(name, line)) {
      return true;
    }
  }
  return false;
}

/// What stands behind an account's name.
bool readAccount(std::string_view rest, Account& account) {
  TakePiece(rest, ":");  // the password
  const std::string_view uid = TakePiece(rest, ":");
  const std::string_view gid = TakePiece(rest, ":");
  if (!ParseNumber(uid, account.uid) || !ParseNumber(gid, account.gid)) {
    return false;
  }
  TakePiece(rest, ":");  // the full name
  account.home = TakePiece(rest, ":");
  account.shell = rest;
  return true;
}

/// What stands behind a group's name.
bool readGroup(std::string_view rest, gid_t& gid, std::string_view& members) {
  TakePiece(rest, ":");  // the password
  const std::string_view id = TakePiece(rest, ":");
  members = rest;
  return ParseNumber(id, gid);
}

bool lists(std::string_view members, std::string_view name) {
  while (!members.empty()) {
    std::string_view member = TakePiece(members, ",");
    member.remove_prefix(std::min(member.find_first_not_of(" \t"), member.size()));
    if (member == name) {
      return true;
    }
  }
  return false;
}

/// The first group of that name counts, as it does for the C library.
Lookup readGroupNamed(const std::string& name, gid_t& gid, std::string_view& members,
                      const EntryFile& file) {
  const bool found = anyLine(file, [&](std::string_view entry, std::string_view rest) {
    return entry == name && readGroup(rest, gid, members);
  });
  return found && !name.empty() ? Lookup::kFound
         : file.readable        ? Lookup::kAbsent
                                : Lookup::kFailed;
}

}  // namespace

Lookup findAccount(const std::string& name, Account& account) {
  const auto file = accounts();
  Account found;
  if (!name.empty() && anyLine(*file, [&](std::string_view entry, std::string_view rest) {
        return entry == name && readAccount(rest, found);
      })) {
    account = std::move(found);
    account.name = name;
    return Lookup::kFound;
  }
  return file->readable ? Lookup::kAbsent : Lookup::kFailed;
}

Lookup findAccountById(uid_t uid, Account& account) {
  const auto file = accounts();
  Account found;
  if (anyLine(*file, [&](std::string_view entry, std::string_view rest) {
        found.name = entry;
        return readAccount(rest, found) && found.uid == uid;
      })) {
    account = std::move(found);
    return Lookup::kFound;
  }
  return file->readable ? Lookup::kAbsent : Lookup::kFailed;
}

Lookup findGroup(const std::string& name, gid_t& gid) {
  const auto file = groups();
  gid_t found = 0;
  std::string_view members;
  const Lookup lookup = readGroupNamed(name, found, members, *file);
  gid = lookup == Lookup::kFound ? found : gid;
  return lookup;
}

Lookup findShadow(const std::string& name, ShadowEntry& entry) {
  const EntryFile file(Paths::kShadow);
  std::string line;
  anyLine(file, [&](std::string_view account, std::string_view rest) {
    const bool found = account == name;
    line = found ? name + ":" + std::string(rest) : "";
    return found;
  });
  std::vector<char> buffer(line.size() + 1);
  spwd found{};
  spwd* parsed = nullptr;
  if (!line.empty() &&
      sgetspent_r(line.c_str(), &found, buffer.data(), buffer.size(), &parsed) == 0) {
    entry = ShadowEntry(found);
    return Lookup::kFound;
  }
  // A line that cannot be read might have said that the account is locked.
  return file.readable && line.empty() ? Lookup::kAbsent : Lookup::kFailed;
}

Lookup findMembership(const Account& account, const std::string& groupName) {
  const auto file = groups();
  gid_t gid = 0;
  std::string_view members;
  const Lookup lookup = readGroupNamed(groupName, gid, members, *file);
  const bool belongs =
      lookup == Lookup::kFound && (gid == account.gid || lists(members, account.name));
  return lookup == Lookup::kFound && !belongs ? Lookup::kAbsent : lookup;
}

Lookup findGroupsOf(const Account& account, std::vector<gid_t>& groupIds) {
  const auto file = groups();
  if (!file->readable) {
    return Lookup::kFailed;
  }
  groupIds.assign(1, account.gid);
  anyLine(*file, [&](std::string_view, std::string_view rest) {
    gid_t gid = 0;
    std::string_view members;
    if (readGroup(rest, gid, members) && gid != account.gid && lists(members, account.name)) {
      groupIds.push_back(gid);
    }
    return false;
  });
  return Lookup::kFound;
}

}  // namespace QELO::Platform
