#pragma once

#include <json/json.h>
#include <sys/types.h>

#include <cstdint>
#include <string>
#include <utility>

#include "webapi/Export.h"

/// The host's sharing library.

/// The environment variable of the header that carries a sharing id.
inline constexpr char SZ_X_SHARING_HEADER[] = "HTTP_X_QELO_SHARING";

extern "C" {

/// What a call by a sharing link is, beside the link and the session.
struct QeloSharingVisit {
  const char* address;  ///< the client's; "" when it is not known
  long long bodySize;   ///< bytes that the client sends
};

/// Whether a visitor may call by a link.
/// @param sharingId   the link's id, or null
/// @param sharingSid  the id of the visitor's session, or null
/// @return 1 yes; -8 the session is bound to another address; -7 it was not opened for this link;
///         -6 the link has expired, its owner may not use it any more, or it takes no body of this
///         size; -5 the link needs a session, and there is none; -4 an id is malformed; -3 the
///         database cannot be asked, which is logged; -2 no such link; -1 the session timed out
WEBAPI_API int QeloSharingIsAuthorized(const char* sharingId, const char* sharingSid,
                                       const QeloSharingVisit* visit);

}  // extern "C"

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

/// What it takes to call by a link, and in whose name the calls are made.
enum _tag_SHARING_PROTECT_TYPE : int {
  SHARING_PROTECT_NONE = 0,     ///< the link alone; in nobody's name
  SHARING_PROTECT_SESSION = 1,  ///< a visitor's session; in nobody's name
  SHARING_PROTECT_OWNER = 2     ///< a visitor's session; in the name of the link's owner
};

/// What the database holds. A record that was not found has the values that stand here.
namespace record {

/// A sharing link.
class Entry {
 public:
  struct Fields {
    int64_t id = 0;           ///< of the record, no secret; 0: no link
    std::string projectName;  ///< of the application that the link is for
    std::string ownerName;
    uid_t ownerUid = static_cast<uid_t>(-1);
    int protectType = SHARING_PROTECT_SESSION;
    bool enableMatchIp = true;
    std::string path;
    bool allowUpload = false;
  };

  Entry() = default;
  explicit Entry(Fields fields) : fields_(std::move(fields)) {}

  int64_t get_id() const { return fields_.id; }
  const std::string& get_project_name() const { return fields_.projectName; }
  const std::string& get_owner_name() const { return fields_.ownerName; }
  uid_t get_owner_uid() const { return fields_.ownerUid; }
  /// A _tag_SHARING_PROTECT_TYPE.
  int get_protect_type() const { return fields_.protectType; }
  /// Whether a visitor's session is bound to the address that it was opened from.
  bool get_enable_match_ip() const { return fields_.enableMatchIp; }
  /// What is shared, as the application writes it.
  const std::string& get_path() const { return fields_.path; }
  bool get_allow_upload() const { return fields_.allowUpload; }

 private:
  Fields fields_;
};

/// A visitor's session.
class Session {
 public:
  Session() = default;
  Session(int64_t id, uid_t ownerUid, int64_t timeout)
      : id_(id), ownerUid_(ownerUid), timeout_(timeout) {}

  int64_t get_id() const { return id_; }             ///< of the record, no secret; 0: no session
  uid_t get_owner_uid() const { return ownerUid_; }  ///< of the links that it was opened for
  int64_t get_timeout() const { return timeout_; }   ///< when it ends, seconds since the epoch

 private:
  int64_t id_ = 0;
  uid_t ownerUid_ = static_cast<uid_t>(-1);
  int64_t timeout_ = 0;
};

/// That a session was opened for a link.
class Token {
 public:
  Token() = default;
  explicit Token(int64_t opened) : opened_(opened) {}

  int64_t get_opened() const { return opened_; }  ///< when, seconds since the epoch; 0: never

 private:
  int64_t opened_ = 0;
};

}  // namespace record

namespace db {

/// The sharing database. Asking opens it; it is closed when QeloSharingIsAuthorized() has been
/// asked, and before the process forks.
class WEBAPI_API SharingDB {
 public:
  static SharingDB& Instance();
  /// Whether the database is there to be asked.
  bool IsGood() const;
};

/// Look-ups; a record that is not found stays as it was, and the result is false.
class WEBAPI_API EntryDB {
 public:
  explicit EntryDB(SharingDB& db);
  /// @param hash  the id that a link's address ends with
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

/// What the operations below come to. Outputs are unchanged unless it is LINK_DONE.
enum LinkResult : int {
  LINK_DONE,
  LINK_ABSENT,          ///< there is no such link, or it is another user's
  LINK_BAD_TERMS,       ///< a term is none, or of a wrong type or out of range
  LINK_TOO_MANY,        ///< the user has as many links as one may have
  LINK_REFUSED,         ///< the link has expired or is used up, or its owner may not use it
  LINK_WRONG_PASSWORD,  ///< the attempt was counted
  LINK_WAIT,            ///< too many wrong passwords from this address
  LINK_FAILED           ///< the database cannot be used, which is logged
};

/// The links of a user. `terms` and `link` are objects, with these members:
///
/// | "project"      | name of the application that the link is for; required, and stays         |
/// | "name"         | for the owner's eyes, 128 bytes at most                                   |
/// | "path"         | what is shared, as the application writes it; 4096 bytes at most          |
/// | "protect"      | "none", "session" or "owner": _tag_SHARING_PROTECT_TYPE; else "session"   |
/// | "password"     | to open the link with, 1 to 128 bytes; "": none. Never shown              |
/// | "matchAddress" | whether a session is bound to the address that opened it; else true       |
/// | "upload"       | whether the application may let visitors upload; else false               |
/// | "expires"      | seconds since the epoch; 0, or missing: never                             |
/// | "maxUses"      | how often it may be opened; 0, or missing: without limit                  |
/// | "maxBytes"     | most bytes that one call may send; 0, or missing: as any call             |
///
/// A `link` has "id" (of the record, no secret), "hasPassword", "created" and "uses" besides; and
/// when it was made or renewed "link", the id that its address ends with, of which the database
/// keeps a hash. A password or limits need a session: "protect" is not "none" then.
WEBAPI_API LinkResult CreateLink(const std::string& owner, const Json::Value& terms,
                                 Json::Value& link);
/// @param links  receives a list, the oldest first
WEBAPI_API LinkResult ListLinks(const std::string& owner, Json::Value& links);
/// Changes the terms that are named. Another password or address match ends the visits so far, and
/// so does "renew" (true), which gives the link another id.
WEBAPI_API LinkResult ChangeLink(const std::string& owner, int64_t id, const Json::Value& terms,
                                 Json::Value& link);
WEBAPI_API LinkResult RemoveLink(const std::string& owner, int64_t id);
/// The owner's link with an id.
/// @param id    the one that its address ends with
/// @param link  receives it, with that id as "link"
WEBAPI_API LinkResult FindLink(const std::string& owner, const std::string& id, Json::Value& link);

/// A visitor opens a link, which is one use of it.
/// @param address  the client's
/// @param visit    receives "sid", the id of a session for this link, "seconds" that it lasts when
///                 it is not used, "project", "path" and "upload"; for LINK_WAIT "retryAfter"
WEBAPI_API LinkResult OpenLink(const std::string& id, const std::string& password,
                               const std::string& address, Json::Value& visit);

}  // namespace QELO::sharing
