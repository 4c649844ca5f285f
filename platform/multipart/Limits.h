#pragma once

#include <cstddef>

/// What one upload may ask for. A person's form has a dozen fields, and a browser sends a header of
/// a few hundred bytes for each.
namespace QELO::Platform::UploadLimits {

inline constexpr size_t kBoundary = 70;        ///< bytes of a boundary (RFC 2046)
inline constexpr size_t kPadding = 64;         ///< blanks behind a boundary
inline constexpr size_t kPreamble = 64 << 10;  ///< bytes in front of the first part
inline constexpr size_t kHeader = 8 << 10;     ///< bytes of a part's header lines together
inline constexpr size_t kHeaderLines = 32;     ///< header lines of a part
inline constexpr size_t kFieldName = 1024;     ///< bytes of an ordinary field's name
inline constexpr size_t kFileField = 63;       ///< bytes of a file field's name
inline constexpr size_t kFileName = 490;       ///< bytes of a file's name
inline constexpr size_t kFields = 1000;        ///< ordinary fields
/// Bytes of all ordinary fields, names and values: they are kept in memory.
inline constexpr size_t kFieldBytes = 1 << 20;
/// Files: each keeps a descriptor open to the end of the process.
inline constexpr size_t kFiles = 512;

}  // namespace QELO::Platform::UploadLimits
