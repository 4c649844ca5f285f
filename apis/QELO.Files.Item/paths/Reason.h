#pragma once

namespace files {

/// Why an item could not be served. The numbers are the API's error codes.
enum class Reason : int {
  kNone = 0,
  kBadPath = 400,
  kBadName = 401,
  kNoShare = 402,
  kShareBroken = 403,
  kNotFound = 404,
  kDenied = 405,
  kExists = 406,
  kNotAFolder = 407,
  kNotAFile = 408,
  kLink = 409,
  kMount = 410,
  kSpecial = 411,
  kReadOnly = 412,
  kFull = 413,
  kTooLarge = 414,
  kTooDeep = 415,
  kChanged = 416,
  kIntoItself = 417,
  kTooMany = 418,
  kBusy = 419,
  kShareItself = 420,
  kFailed = 421,
  kTooManyTasks = 422,
  kNoHome = 423,
};

/// The word that clients see beside the code, as "not_found".
const char* wordOf(Reason reason);

/// What an error of the system means for an item. 0 is kNone, an unknown one kFailed.
Reason reasonOf(int error);

}  // namespace files
