#pragma once

#include <sys/types.h>

#include "webapi/Export.h"

/// The host's core library: files, locks, processes, configuration keys, users and groups.
extern "C" {

/// @return 1 when the path exists, else 0
WEBAPI_API int QLIBCFileExist(const char* path);
/// Sets a file's times to now, creating it empty. @return 0 on success
WEBAPI_API int QLIBCFileTouch(const char* path);
/// Takes a lock on a file, which is created.
/// @param type     1: exclusive
/// @param seconds  how long to wait for it
/// @param fd       receives the descriptor that holds the lock
/// @return 0 or more on success; a negative value when it was not to be had
WEBAPI_API int QLIBCFileLockTimeByFile(const char* path, int type, int seconds, int* fd);
WEBAPI_API int QLIBCFileUnlockByFile(int fd);
/// Makes the ASCII letters of a text small, in place; other bytes stay.
WEBAPI_API void QLIBCStrCaseLower(char* text);
/// Whether a file of `key="value"` lines gives `key` this value. @return 1 yes, 0 no
WEBAPI_API int QLIBCFileCheckKeyValue(const char* file, const char* key, const char* value,
                                      int ignoreCase);
/// Sets a key of the system information file, /etc/qeloinfo.conf, which keeps its other lines.
/// @param key    letters, digits and "_" "-" "."
/// @param value  one line of text that does not hold both kinds of quotes
/// @return 0 on success, a negative value on failure
WEBAPI_API int QLIBCINFOSetKeyValue(const char* key, const char* value);
/// Creates a directory and its parents.
/// @param keepExistingOwner  0: a directory that exists is given to the owner too
/// @param uid, gid  owner of what is created, -1: as it comes
/// @param mode      search permission is added wherever it grants reading
/// @return 0 on success, also when it exists
WEBAPI_API int QELOFSMkdirP(const char* path, int keepExistingOwner, int reserved, uid_t uid,
                            gid_t gid, mode_t mode);

/// A volume: a file system for users' data.
struct QELOVolumeRecord {
  char path[1024];
};
/// Finds a volume with room.
/// @param size    bytes that it must have free
/// @param volume  receives the volume
/// @return 1 when there is one; 0 else, and `volume` is unchanged
WEBAPI_API int VolumeAvailGet(unsigned long long size, struct QELOVolumeRecord* volume);

/// Notes the last error of the process, for whoever asks with QLIBCErrGet().
WEBAPI_API void QLIBCErrSetEx(int error, const char* file, int line);
/// @return 0 when none was noted
WEBAPI_API int QLIBCErrGet(void);

/// Forks a background process: the child has /dev/null as descriptors 0, 1 and 2, so that nobody
/// who waits for the end of our output waits for it. Buffered output is written first.
/// @return as fork()
WEBAPI_API pid_t QLIBCProcFork(void);
/// Forks leaving the standard descriptors as they are. Buffered output is written first.
/// @param flags  65 is what callers here pass; no bit changes anything
WEBAPI_API pid_t QLIBCProcForkEx(int flags);

/// The ids of a user. @return 0 on success
WEBAPI_API int QELOUserGetUGID(const char* name, uid_t* uid, gid_t* gid);
/// A user of the system.
struct QeloUser {
  char* name;
  uid_t uid;
  gid_t gid;
};
/// Looks up a user by id; of several with the same id the first of the account database.
/// @param user  receives the user, which QELOUserFree() frees; null on failure
/// @return 0 on success
WEBAPI_API int QELOUserGetByUID(uid_t uid, QeloUser** user);
WEBAPI_API void QELOUserFree(QeloUser* user);  ///< null: nothing
/// Whether what a user was given before, a session or a token, may still be used.
/// @return "good"; else why not: "not for logins", "locked", "expired", or "not readable" when the
///         accounts cannot be read; null when there is no such user. The text is static.
WEBAPI_API const char* QELOUserStandingGet(const char* user);
/// @return 1 when the user is an administrator, 0 when not, -1 when that cannot be told
WEBAPI_API int QLIBGroupIsAdminGroupMem(const char* user, int flags);
/// @return 1 when the user may use the application from this address, else 0
WEBAPI_API int QLIBAppPrivUserHas(const char* user, const char* application, const char* address);
/// The user's directory for preferences. @return a negative value on failure
WEBAPI_API int QELOUserPreferenceDirGet(const char* user, char* path, int size);
WEBAPI_API int QELOGroupPreferenceDirGet(const char* group, char* path, int size);
/// The idle time-out of login sessions in seconds.
WEBAPI_API int QLIBCConfGetARDOTimeout(void);
/// The most entries of one compound request, those of compound requests within it counted.
/// @param loggedIn  0: for a caller who is not logged in; else for one who is
WEBAPI_API int QLIBCConfGetCompoundEntries(int loggedIn);

/// How slow the client of a transfer may be.
struct QLIBCTransferLimits {
  unsigned leastRate;  ///< bytes a second that it sends on the average; 0: any
  unsigned window;     ///< seconds that this is the average of
  unsigned longest;    ///< seconds that it is waited for in all; 0: without end
};

/// Of a body that comes.
WEBAPI_API void QLIBCConfGetBodyLimits(struct QLIBCTransferLimits* limits);

}  // extern "C"
