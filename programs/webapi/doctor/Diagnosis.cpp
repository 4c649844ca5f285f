#include "programs/webapi/doctor/Diagnosis.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {
namespace {

constexpr unsigned kAllBits = 07777;

std::string octal(unsigned mode) {
  char text[16];
  snprintf(text, sizeof text, "%04o", mode);
  return text;
}

}  // namespace

void Diagnosis::Good(const std::string& what) {
  printf("ok: %s\n", what.c_str());
}

void Diagnosis::Note(const std::string& what) {
  printf("note: %s\n", what.c_str());
}

void Diagnosis::Wrong(const std::string& what, const std::string& remedy) {
  ++wrong_;
  printf("wrong: %s; %s\n", what.c_str(), remedy.c_str());
}

void LookAtPlace(const Place& place, Diagnosis& diagnosis) {
  const std::string named = std::string(place.what) + " " + Shown(place.path);
  struct stat info {};
  if (lstat(place.path.c_str(), &info) != 0) {
    if (errno != ENOENT) {
      return diagnosis.Note(named + ": " + strerror(errno) +
                            (geteuid() == 0 ? "" : "; ask as root"));
    }
    if (place.missing == Missing::kWrong) {
      return diagnosis.Wrong(named + " is missing", "install again, or make it");
    }
    return diagnosis.Good(
        named + " is not there, and " +
        (place.missing == Missing::kMadeLater ? "will be made when it is needed" : "need not be"));
  }
  if (place.isDirectory ? !S_ISDIR(info.st_mode) : !S_ISREG(info.st_mode)) {
    return diagnosis.Wrong(named + (place.isDirectory ? " is no directory" : " is no regular file"),
                           "remove it");
  }
  if (info.st_uid != 0 && info.st_uid != geteuid()) {
    return diagnosis.Wrong(named + " belongs to the user " + std::to_string(info.st_uid),
                           "chown root " + Shown(place.path));
  }
  const unsigned mode = info.st_mode & kAllBits;
  if ((mode & ~place.mode) != 0) {
    return diagnosis.Wrong(named + " has the mode " + octal(mode),
                           "chmod " + octal(place.mode) + " " + Shown(place.path));
  }
  diagnosis.Good(named);
}

}  // namespace QELO::AuthorProgram
