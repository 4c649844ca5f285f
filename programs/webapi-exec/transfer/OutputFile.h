#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>

namespace QELO::ExecProgram {

/// The file that gets what a downloading method sends.
///
/// An ordinary file is written beside its place, as "FILE.part", and takes it when it is whole:
/// what stood there before is not lost to a download that breaks off. What there is of a broken one
/// is kept with the mark of its content, and the next call goes on with it. A device, a pipe or a
/// link is written in place, and so is a file in a directory where no other can be made.
class OutputFile {
 public:
  OutputFile() = default;
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;
  ~OutputFile();

  /// @param path  "": nowhere
  /// @return 0, or the errno of the failure
  int Open(const std::string& path);
  int Descriptor() const { return file_; }

  /// What a call may ask to go on from; 0: from the beginning.
  off_t There() const { return there_; }
  /// The mark of the content that There() is of.
  const std::string& Mark() const { return mark_; }

  /// Makes ready for what an answer with this header sends.
  void Begin(const std::string& head);
  /// Bytes of the whole content, 0 when that is not known; and of what is there when it begins.
  uint64_t Total() const { return total_; }
  uint64_t Done() const { return static_cast<uint64_t>(there_); }

  /// Puts the file in its place, or leaves what there is for a later call.
  /// @param isWhole  the call has succeeded and all was written
  /// @return 0, or the errno of the failure
  int Finish(bool isWhole);
  /// What a call that failed leaves behind, for people; "" for nothing.
  const std::string& Left() const { return left_; }

 private:
  /// @return 0; the errno of the failure when another call writes the file; -1 when there can be
  ///         no other file beside it
  int OpenPart(const std::string& path);

  std::string path_;
  std::string part_;  ///< "": written in place
  std::string mark_;
  std::string left_;
  int file_ = -1;
  bool hasMark_ = false;  ///< on the file
  off_t there_ = 0;
  uint64_t total_ = 0;
};

}  // namespace QELO::ExecProgram
