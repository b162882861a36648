// Config: the abstract base of the two locked JSON configuration files, folder.conf (Folders)
// and status.conf (Status).
//
// A writer constructs the subclass on its stack, calls Lock(true), Load(), changes it, Save(),
// and Unlock() on every way out. A reader calls Load() alone. The lock is advisory (flock on a
// separate lock file under /tmp) and fail-fast: it is never waited for, so a writer meeting a
// held lock fails with error 9 within about 30 ms and must retry if it wants to. Two instances
// in one process (two threads, or one thread twice) conflict like two processes: the second
// Lock(true) fails with error 9 instead of waiting.
#pragma once

#include "fileindex/export.h"

#include <string>

#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT Config {
public:
    Config();
    // Neither unlocks nor closes: every path that locks must call Unlock itself.
    virtual ~Config();
    Config(const Config&) = delete;
    Config& operator=(const Config&) = delete;

    virtual bool Load() = 0;
    virtual bool Save() = 0;
    virtual std::string GetLockPath() const = 0;
    virtual std::string GetPath() const = 0;

    // Fills the body from GetPath(). A missing file is an empty configuration (true), and so is
    // anything there that is not a regular file (a link, a FIFO): nothing is read through it and
    // the next save puts a regular file in its place. An unreadable or invalid file: false,
    // error 6, body as it was.
    bool LoadJson();
    // Replaces the file atomically (a temporary in the same directory, flushed, renamed, the
    // directory synced) with mode 0644, first removing temporaries that killed saves left. A
    // failed write: false, error 7, the old file intact. A failed chmod is only logged.
    // REQUIRES: the exclusive lock is held (Lock(true)), as every writer of the library does.
    bool SaveJson();
    // Three non-blocking attempts 0-9 ms apart; error 9 when the lock stays held or the lock file
    // cannot be opened. The lock file is opened without following a symbolic link and must be a
    // regular file. The descriptor of each failed attempt is closed, so that a process meeting
    // contention many times runs out of nothing.
    bool Lock(bool exclusive);
    // Releases the lock and closes its descriptor.
    // REQUIRES: only after a successful Lock, once; after a failed Lock it does nothing.
    void Unlock();

protected:
    Json::Value body;
    int lock_fd;
};

}  // namespace FILEINDEX
}  // namespace QIRA
