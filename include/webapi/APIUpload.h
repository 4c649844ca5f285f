#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIRequest;
class APIUploadPrivate;

/// A file that came with the request: what docs/uploads.md tells for the client's side.
///
/// A method with "allowUpload" is called when all of the upload has arrived. What came is then in
/// the request: ordinary fields as parameters, and the files here.
///
///     for (const Json::Value& file : QELO::APIUpload(request).GetFiles()) { ... }
///
/// With "deferUpload" too, a method is called at once and reads the upload itself, part after part,
/// with its own credentials:
///
///     QELO::APIUpload upload(request);
///     Json::Value params(Json::objectValue);
///     int result = upload.GetUploadParam(params);
///     while (result == QELO::APIUpload::DONE && upload.HasFile()) {
///       result = upload.GetUploadFile(params);
///       if (result == QELO::APIUpload::DONE) {
///         result = upload.GetUploadParam(params);
///       }
///     }
///
/// PARTIAL ends the loop when a client sends one large file in several requests, as
/// docs/uploads.md tells, and this was not the last: GetSlice() is the answer then.
///
/// A temporary file is the account's that the method runs as, with mode 0600. It is removed when
/// the method has ended, before its answer is printed, unless the method has renamed it; and it is
/// locked (flock) as long as the process lives.
class WEBAPI_API APIUpload {
 public:
  /// Results. They are the "upload_err" of error 108.
  enum Result : int {
    DONE = 1,
    PARTIAL = 2,        ///< a slice has arrived, and more of its file is to come
    BROKEN_OFF = -1,    ///< the body ended early, stalled or could not be read
    NO_DIRECTORY = -2,  ///< no temporary directory has room for it
    MALFORMED = -3,     ///< the body is no form, or one that is not whole
    TOO_LARGE = -4,     ///< a field, a name, a header or their number is beyond its limit
    NO_TEMPORARY = -5,  ///< a temporary file could not be made or written
    NOTHING_LEFT = -6,  ///< the request announces no body, or all of it has been read
    NO_SPACE = -7,      ///< the disk, or the account's part of it, was full before all was written
    NO_FILE = -8,       ///< GetUploadFile() without a file that follows
    NO_MEMORY = -9,     ///< without memory, or the fields are more than a request may have
    WRONG_SLICE = -10,  ///< a slice that does not follow what has arrived, or is nobody's
    BUSY = -11          ///< another request adds to the file of the slice
  };

  /// @param request  outlives this; null: nothing can be loaded
  explicit APIUpload(APIRequest* request);
  APIUpload(const APIUpload&) = delete;
  APIUpload& operator=(const APIUpload&) = delete;
  ~APIUpload();

  /// Has a function called while GetUploadParam() and GetUploadFile() read, about every 256 KiB;
  /// null: none. It may not throw.
  /// @param callback  receives the bytes of the body that have arrived, and how many there will be
  void SetUploadCallback(void (*callback)(unsigned long long done, unsigned long long total));

  /// Loads the whole upload. The web entry does that for methods without "deferUpload".
  /// @param params    receives the fields, and under a file's field the path of its temporary file.
  ///                  A client can send a path as an ordinary field: ask GetFiles() for files
  /// @param tmpFiles  receives the paths of the temporary files, as a list to append to; may be
  /// null
  /// @return a Result; on failure `params` is unchanged
  int GetUploadAll(Json::Value& params, Json::Value* tmpFiles);
  /// Loads the ordinary fields up to the next file, or to the end. A field's value that is JSON
  /// text as a whole is that JSON, as in any parameter.
  /// @param params  receives the fields, and under the file's field the name that it has at the
  ///                client's, without folders
  /// @return a Result
  int GetUploadParam(Json::Value& params);
  /// Loads the file that GetUploadParam() has found.
  /// @param params  receives the path of the temporary file under the file's field
  /// @return a Result
  int GetUploadFile(Json::Value& params);

  /// Reads some of a body that is no form, in a method with "deferUpload" whose client sends bytes
  /// as they are. It waits for them no longer than for those of any upload.
  /// @return how many bytes; 0 when all that the request announces have been read; BROKEN_OFF
  static long long ReadBody(char* buffer, unsigned long long size);

  /// Whether GetUploadParam() has found a file that GetUploadFile() has not loaded yet.
  bool HasFile() const;
  /// The field and the name of that file; "" when there is none.
  std::string GetFileField() const;
  std::string GetFileName() const;

  /// Of a request with a slice of a file, how much there is of that: {"received", "size"}, in
  /// bytes; null for all others. It is the answer to PARTIAL, and belongs beside WRONG_SLICE.
  Json::Value GetSlice() const;

  /// All files of the request that have been loaded, in the order of their fields' names or, with
  /// "deferUpload", in the order in which they came: a list of objects {"field", "name", "path",
  /// "size"}. A client cannot put a path of its own here.
  Json::Value GetFiles() const;

 private:
  std::unique_ptr<APIUploadPrivate> private_;
};

}  // namespace QELO
