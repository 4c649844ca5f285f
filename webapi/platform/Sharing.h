#pragma once

#include <string>

#include "webapi/Export.h"

/// The host's sharing library.

/// The environment variable of the header that carries a sharing id.
inline constexpr char SZ_X_SHARING_HEADER[] = "HTTP_X_QELO_SHARING";

namespace QELO::sharing {

/// The cookie that carries a sharing session id.
inline constexpr char SZK_SHARING_SID[] = "sharing_sid";

/// How a sharing link's address was made.
enum _tag_SHARING_URL_TYPE : int {
  SHARING_URL_HOST = 0,    ///< the host and path that the client called
  SHARING_URL_REWRITE = 1  ///< an application's own path on that host
};

/// The address that sharing links of this host start with.
/// @param port        left out of the address when it is the protocol's own, or 0
/// @param path        path that the client called, ending in "/"
/// @param rewriteApp  application whose path is used instead, or ""
/// @return false, with an empty `url`, when there is no host
WEBAPI_API bool GetSharingURL(const std::string& host, int port, bool isHttps,
                              const std::string& path, const std::string& rewriteApp,
                              std::string& url, _tag_SHARING_URL_TYPE& type);

namespace record {
/// A sharing link, a visitor's session and the visitor's token for one link.
class Entry {};
class Session {};
class Token {};
}  // namespace record

namespace db {

/// The sharing database.
class WEBAPI_API SharingDB {
 public:
  static SharingDB& Instance();
  /// Whether the database can be asked.
  bool IsGood() const;
};

/// Look-ups; a record that is not found stays as it was, and the result is false.
class WEBAPI_API EntryDB {
 public:
  explicit EntryDB(SharingDB& db);
  bool GetByHash(const std::string& hash, record::Entry& entry);
};
class WEBAPI_API SessionDB {
 public:
  explicit SessionDB(SharingDB& db);
  bool GetBySessionId(const std::string& id, record::Session& session);
};
class WEBAPI_API TokenDB {
 public:
  explicit TokenDB(SharingDB& db);
  bool GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                         record::Token& token);
};

}  // namespace db
}  // namespace QELO::sharing
