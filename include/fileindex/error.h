// The library's process-wide error code and log level.
//
// Every operation reports success through its return value. When it fails it writes one line to
// the system log (LOG_ERR, "file.cc:line message"; a failure caused by a callee usually adds a
// line of its own) and, for the causes below, sets the error code. The code is sticky: success
// never resets it and nothing in the library sets it back to 0, so read it right after the
// failing call (or clear it before the call with SetError(FILEINDEX_ERR_NONE)). Some failures set
// no code at all (a platform step or the daemon failed): then only the log tells the cause.
//
// Thread behaviour: one plain integer shared by all threads, neither locked nor atomic; with
// concurrent callers the code read may belong to another thread's failure.
#pragma once

#include "fileindex/export.h"

#include <cstdint>

namespace QIRA {
namespace FILEINDEX {

enum _tag_fileindex_err_ : int32_t {
    // Initial value; never set by the library.
    FILEINDEX_ERR_NONE = 0,
    // A request is malformed or names an unknown item: an upsert or delete request that is not an
    // array or has a bad element ("Bad param: %s"), a path or share name holding a NUL byte, a
    // non-canonical upsert or reindex path, an unknown listing fact ("Unknown additional: %s"), a
    // negative pause.
    FILEINDEX_ERR_BAD_PARAM = 1,
    // A share or path could not be resolved (the share is unknown to the platform).
    FILEINDEX_ERR_PATH = 2,
    // Value 3 is reserved and never set.
    // Folders::Get or IndexMgr::Get found no folder of that path ("No such folder: %s").
    FILEINDEX_ERR_NO_SUCH_FOLDER = 4,
    // An upsert would hold more than 1000 folders ("Exceed max folder size").
    FILEINDEX_ERR_EXCEED_MAX_FOLDER = 5,
    // A configuration file exists but cannot be read or is not JSON ("Failed to load json from %s").
    FILEINDEX_ERR_LOAD_JSON = 6,
    // A configuration file could not be written ("Failed to save json to %s").
    FILEINDEX_ERR_SAVE_JSON = 7,
    // folder.conf is JSON but not an object of folders ("Malformed folders: %s").
    FILEINDEX_ERR_MALFORMED_FOLDERS = 8,
    // A configuration lock is held by another holder after three quick attempts ("Failed to lock
    // folder"): retry later.
    FILEINDEX_ERR_LOCK = 9,
};

// 7 turns on the debug-only log lines of the event queue; a host may assign it. Initially 3.
extern FILEINDEX_EXPORT int LOG_LEVEL;

class FILEINDEX_EXPORT ErrorHandler {
public:
    ErrorHandler() = delete;
    // Stores `code`; no other effect. Callers may clear the code with FILEINDEX_ERR_NONE.
    static void SetError(_tag_fileindex_err_ code);
    // The code of the last failure that set one (0 when none did).
    static _tag_fileindex_err_ GetError();

private:
    static _tag_fileindex_err_ g_error_code;
};

}  // namespace FILEINDEX
}  // namespace QIRA
