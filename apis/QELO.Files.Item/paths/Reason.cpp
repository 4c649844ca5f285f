#include "paths/Reason.h"

#include <cerrno>

namespace files {
namespace {

struct Word {
  Reason reason;
  const char* word;
};

constexpr Word kWords[] = {
    {Reason::kNone, "none"},
    {Reason::kBadPath, "bad_path"},
    {Reason::kBadName, "bad_name"},
    {Reason::kNoShare, "no_share"},
    {Reason::kShareBroken, "share_broken"},
    {Reason::kNotFound, "not_found"},
    {Reason::kDenied, "denied"},
    {Reason::kExists, "exists"},
    {Reason::kNotAFolder, "not_a_folder"},
    {Reason::kNotAFile, "not_a_file"},
    {Reason::kLink, "link"},
    {Reason::kMount, "mount"},
    {Reason::kSpecial, "special"},
    {Reason::kReadOnly, "read_only"},
    {Reason::kFull, "full"},
    {Reason::kTooLarge, "too_large"},
    {Reason::kTooDeep, "too_deep"},
    {Reason::kChanged, "changed"},
    {Reason::kIntoItself, "into_itself"},
    {Reason::kTooMany, "too_many"},
    {Reason::kBusy, "busy"},
    {Reason::kShareItself, "share_itself"},
    {Reason::kFailed, "failed"},
    {Reason::kTooManyTasks, "too_many_tasks"},
    {Reason::kNoHome, "no_home"},
};

struct Meaning {
  int error;
  Reason reason;
};

constexpr Meaning kMeanings[] = {
    {0, Reason::kNone},
    {ENOENT, Reason::kNotFound},
    {EACCES, Reason::kDenied},
    {EPERM, Reason::kDenied},
    {EEXIST, Reason::kExists},
    {ENOTEMPTY, Reason::kExists},
    {ENOTDIR, Reason::kNotAFolder},
    {EISDIR, Reason::kNotAFile},
    {ELOOP, Reason::kLink},
    {EXDEV, Reason::kMount},  // what leads out of the folder otherwise is refused as a path
    {ENXIO, Reason::kSpecial},
    {ENODEV, Reason::kSpecial},
    {EROFS, Reason::kReadOnly},
    {ENOSPC, Reason::kFull},
    {EDQUOT, Reason::kFull},
    {EFBIG, Reason::kTooLarge},
    {EAGAIN, Reason::kChanged},  // of openat2(): something was moved meanwhile
    {ESTALE, Reason::kChanged},
    {EINVAL, Reason::kFailed},
    {EMLINK, Reason::kTooMany},
    {ENAMETOOLONG, Reason::kBadName},
    {EBUSY, Reason::kBusy},
    {ETXTBSY, Reason::kBusy},
};

}  // namespace

const char* wordOf(Reason reason) {
  for (const Word& word : kWords) {
    if (word.reason == reason) {
      return word.word;
    }
  }
  return "failed";
}

Reason reasonOf(int error) {
  for (const Meaning& meaning : kMeanings) {
    if (meaning.error == error) {
      return meaning.reason;
    }
  }
  return Reason::kFailed;
}

}  // namespace files
