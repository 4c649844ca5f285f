#pragma once

#include <sys/types.h>

#include "webapi/Export.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/StringHash.h"

/// The host's CGI library, of uploads: the request's body, multipart/form-data on standard input,
/// is read once, part after part, by whichever of the loaders is called. The body's length and the
/// boundary are those of the CGI variables CONTENT_LENGTH and CONTENT_TYPE of the process.
///
/// A part with a file name is a file; its name is what the client sent behind the last "/" or "\".
/// All others are ordinary fields, also the file field of a browser in which no file was chosen.
/// Fields, headers and names have limits, and so have their numbers: beyond one the result is
/// QELO_UPLOAD_TOO_LARGE. After a failure every further call has the same result.
///
/// Files are received into temporary files of mode 0600 that have no name until they are whole, and
/// are removed at the end of the process that made them, whatever else becomes of them. Those that
/// a process which was killed left behind are removed by the next upload into the same directory.
extern "C" {

/// Results of the loaders. The caller's own are -2, -6 and -8.
enum QeloUploadResult {
  QELO_UPLOAD_DONE = 1,
  QELO_UPLOAD_PARTIAL = 2,      ///< a slice has been received, and more of its file is to come
  QELO_UPLOAD_BROKEN_OFF = -1,  ///< the body ended early, stalled or could not be read
  QELO_UPLOAD_MALFORMED = -3,   ///< it is no form, or one that is not whole
  QELO_UPLOAD_TOO_LARGE = -4,   ///< a field, a header or their number is beyond its limit
  QELO_UPLOAD_NO_FILE = -5,     ///< a temporary file could not be made or written
  QELO_UPLOAD_NO_SPACE = -7,    ///< the disk, or the owner's part of it, is full
  QELO_UPLOAD_NO_MEMORY = -9,
  QELO_UPLOAD_WRONG_SLICE = -10,  ///< it says not what it is, or does not follow what has come
  QELO_UPLOAD_BUSY = -11          ///< another request has the file of the slice
};

/// How far an upload has come. All zero before the first loader is called.
struct QeloCgiUploadState {
  unsigned long long left;   ///< bytes of the body that are still to be taken apart
  unsigned long long total;  ///< bytes of the body
  int result;                ///< of the last loader
};

/// @param done   bytes of the body that have arrived
/// @param total  all of them
typedef void (*QeloCgiUploadProgress)(unsigned long long done, unsigned long long total);

/// Who temporary files shall belong to from now on, instead of the effective user.
WEBAPI_API void QeloCgiUploadOwnerSet(uid_t uid, gid_t gid);

/// Whose slices the request has: a file is put together from the slices of one caller. Without it
/// slices are refused. What there is of the file is looked for at once, with the rights that the
/// process has now: a method that receives its upload itself may have fewer.
/// @param uid  4294967295: nobody's; what was open is let go, and is another request's to add to
/// @return 0, also when the request has none; else why the loaders will refuse it, a negative
///         QeloUploadResult
WEBAPI_API int QeloCgiUploadCallerSet(uid_t uid);
/// Of a request with a slice, how much of its file there is.
/// @return 1, and 0 when it has none of anybody's
WEBAPI_API int QeloCgiUploadSliceGet(unsigned long long* received, unsigned long long* size);

/// Reads some of a body that is no form, which comes as the limits of a slow client allow.
/// @return how many bytes; 0 when all that were announced have been read; else a negative
///         QeloUploadResult, also when another loader has begun on the body
WEBAPI_API long long QeloCgiReadBody(char* buffer, unsigned long long size);

/// Loads the whole body. Where the CGI variable HTTP_X_TYPE_NAME is "SLICEUPLOAD", in any case, the
/// body's file is a slice of one that comes in several requests: `files` has it when it is whole.
/// @param parameters  receives the ordinary fields, and a file's name under its field
/// @param files       receives the path of each file under its field; a field's second file is
/// under
///                    "FIELD[1]", and so on
/// @param directory   where the files go
/// @param reserved    0
/// @return a QeloUploadResult; on failure there is no file
WEBAPI_API int QeloCgiLoadUploadAll(QLIBSZHASH** parameters, QLIBSZHASH** files,
                                    const char* directory, int reserved);

/// Loads the fields in front of the first file into the context's hash, which is there.
/// QeloCgiLoadUploadAll() and QeloCgiLoadUploadParams() hand them out once more.
/// @param needed     how many the caller looks for; others may stand between them, so all are read
/// @param positions  receives how many bytes have been taken apart, and the length of the whole
/// body
/// @param part       receives the header of the part that follows, cut to `size`; "" at the end
/// @return 1 on success; a negative QeloUploadResult else
WEBAPI_API int QeloCgiLoadUploadNumParams(QeloCgiContext* context, int needed, int reserved,
                                          unsigned long long positions[2], char* part, int size);

/// Loads the fields up to the next file. Where the request has slices and its body none, the result
/// is QELO_UPLOAD_PARTIAL: it asks how much of the file there is.
/// @param part   receives the file's header, cut to `partSize`; "" when no file follows
/// @param field  receives the file's field; "" likewise. One that does not fit is beyond its limit,
/// @param file   and so is its name
/// @return a QeloUploadResult, which is in the state too
WEBAPI_API int QeloCgiLoadUploadParams(QLIBSZHASH** parameters, QeloCgiUploadProgress progress,
                                       QeloCgiUploadState* state, char* part, int partSize,
                                       char* field, int fieldSize, char* file, int fileSize);

/// Loads the file that the three texts tell of, which are empty afterwards. Of a slice it is the
/// file that came in slices, when this was the last, and otherwise nothing, by QELO_UPLOAD_PARTIAL.
/// @param parameters  receives the temporary file's path under the file's field
/// @return a QeloUploadResult, which is in the state too
WEBAPI_API int QeloCgiLoadUploadFileToDir(QLIBSZHASH** parameters, const char* directory,
                                          QeloCgiUploadProgress progress, QeloCgiUploadState* state,
                                          char* part, char* field, char* file);

}  // extern "C"
