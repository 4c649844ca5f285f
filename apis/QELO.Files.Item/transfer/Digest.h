#pragma once

#include <cstddef>
#include <string>

namespace files {

/// A checksum of what is written, by a library that is loaded for it.
class Digest {
 public:
  virtual ~Digest() = default;
  virtual void Add(const char* data, size_t size) = 0;
  /// The bytes of the checksum; nothing may be added then.
  virtual std::string Finish() = 0;
};

/// What the library has. Null for an algorithm that it has not: it has "sha1" and "sha256".
using MakeDigest = Digest* (*)(const char* algorithm);
inline constexpr char kDigestLibrary[] = "QELO.Files.Digest.so";
inline constexpr char kMakeDigest[] = "QeloFilesMakeDigest";

}  // namespace files
