#pragma once

#include <sys/types.h>

#include <map>
#include <string>

/// What the loaders of uploads answer, and what they were given.
struct FakeUpload {
  std::map<std::string, std::string> parameters;  ///< that each loader adds
  std::map<std::string, std::string> files;       ///< that the loader of all adds
  bool runsShort = false;                         ///< the loader of all gets no memory in the end
  int all = 1;                                    ///< results
  int fields = 1;
  int params = 1;
  int file = 1;
  std::string part;  ///< of the file that follows
  std::string field;
  std::string name;
  unsigned long long left = 0;
  unsigned long long positions[2] = {};
  std::string body;        ///< one that is no form
  bool callsBack = false;  ///< the progress function is called with 1 of 2

  uid_t caller = static_cast<uid_t>(-1);
  unsigned long long sliceReceived = 0;
  unsigned long long sliceSize = 0;  ///< 0: no slice was loaded

  std::string directory;  ///< where files were to go
  uid_t owner = static_cast<uid_t>(-1);
  gid_t group = static_cast<gid_t>(-1);

  std::string volume;  ///< "": there is none with room
  unsigned long long wanted = 0;
  int error = 0;  ///< of QLIBCErrSetEx
};
