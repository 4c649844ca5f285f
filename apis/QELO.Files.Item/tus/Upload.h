#pragma once

#include <sys/types.h>

#include <cstdint>
#include <ctime>
#include <string>

#include "paths/Located.h"
#include "paths/NewFile.h"

namespace files {

/// What is known of an upload that comes in several requests. It stands in a directory of the
/// user's own, by an id that nobody can guess; the data is in the folder that the file will be in,
/// as a file of the user's with a name of the API's own.
struct UploadState {
  VirtualPath path;  ///< of the file when it is whole
  Existing existing = Existing::kRefuse;
  uint64_t length = 0;         ///< bytes of the whole
  std::string metadata;        ///< as the client has sent it
  std::string dataName;        ///< of the unfinished file
  uint64_t inode = 0;          ///< of the unfinished file
  int64_t checkedLength = -1;  ///< bytes that stay when a checksum is not reached; -1: all
  bool isFinished = false;
};

/// The uploads of one user.
class UploadStore {
 public:
  static constexpr time_t kLifetime = 7 * 24 * 3600;  ///< seconds after the last data
  static constexpr time_t kFinishedLifetime = 3600;   ///< seconds that a finished one is told of
  static constexpr unsigned kMostUnfinished = 100;    ///< of a user
  static constexpr unsigned kMostStates = 1000;       ///< files that are looked at in all

  /// @param preferences  the user's directory for preferences
  explicit UploadStore(const std::string& preferences) : directory_(preferences + "/uploads") {}

  static bool IsId(const std::string& id);

  /// Makes room: removes what has expired, with its data.
  /// @return whether there may be one more
  bool Sweep(const Shares& shares) const;
  /// @param id  receives the new id
  bool Create(const UploadState& state, std::string& id) const;
  bool Load(const std::string& id, UploadState& state) const;
  bool Save(const std::string& id, const UploadState& state) const;
  void Remove(const std::string& id) const;

 private:
  std::string FileOf(const std::string& id) const { return directory_ + "/" + id + ".json"; }

  std::string directory_;
};

/// The unfinished file of an upload, open and locked against other requests.
class UploadData {
 public:
  /// Makes the file and tells the state of it.
  /// @param folder  the folder that the file will be in
  static Reason Make(const Folder& folder, UploadState& state, UploadData& data);
  /// @return kNotFound, kChanged when it is another's by now, kBusy when it is being written
  static Reason Open(const Shares& shares, const UploadState& state, UploadData& data);

  int Get() const { return file_.Get(); }
  uint64_t Length() const;
  /// When data came last.
  time_t LastChange() const;
  Reason Cut(uint64_t length) const;
  /// Gives the file its name.
  Reason Finish(const UploadState& state) const;
  void Remove(const UploadState& state) const;

 private:
  Folder folder_;
  Descriptor file_;
};

}  // namespace files
