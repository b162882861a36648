// StatusMgr: pause and resume, share flags, markers and status words, each call on a fresh image
// of status.conf.
//
// Readers take no lock and answer false both for "no" and for an unreadable status.conf (the
// load's error 6 stays set). Writers hold the exclusive status.conf lock from before the load
// until they return, across the daemon command; the lock is fail-fast (error 9 at once when
// another process or thread holds it). A writer saves before it tells the daemon: a false return
// after a failed command leaves status.conf changed (logged "SendCammandToDaemon failed", no
// error code). A share or marker name holding a NUL byte: false, error 1, nothing touched.
#pragma once

#include "fileindex/export.h"

#include <string>

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT StatusMgr {
public:
    StatusMgr() = delete;

    // --- Readers ---
    // -1 running, 0 paused until resumed, else the end in epoch seconds; untouched on failure.
    static bool GetPauseInfo(long long& resumeTime);
    static bool ShareIsNoSpace(const std::string& share);
    static bool ShareIsNeedReindex(const std::string& share);
    static bool IsUpdated(const std::string& name);

    // --- Writers ---
    static bool SetUpdated(const std::string& name);
    // A new out-of-space flag raises the administrators' notice (its failure is only logged).
    static bool ShareSetNoSpace(const std::string& share, bool noSpace);
    static bool ShareSetNeedReindex(const std::string& share, bool needReindex);
    // hours < 0: error 1, nothing touched; 0: until resumed; otherwise now + hours, computed in
    // 32 bits (a sum past 2038-01-19 wraps to a negative time that reads as running). Sends
    // "pause" with the stored time.
    static bool Pause(const int& hours);
    // Stores -1 (running) and sends "resume".
    static bool Resume();
    // Clears the share's out-of-space flag and sends "revive_share_worker".
    static bool ShareRevive(const std::string& share);

    // --- Status words; no lock ---
    // "finished", "processing" or "paused": the first share whose queue file (or ".tmp") exists
    // decides. False when folder.conf, a share name, a queue path or the pause state cannot be
    // read.
    static bool GetStatus(std::string& status);
    // "finished", "processing", "paused" (also: the folder cannot be indexed) or "err_no_space".
    // Never fails: problems are logged and answer "finished". The queue and its companion are read
    // incrementally: the process keeps, per queue file, how far it has read and the records of the
    // folders asked about, and a later call reads only what was appended since, so that hosts that
    // ask every few seconds do not read the whole queue again; for the same reason a malformed line
    // is logged once per process, when it is first read. Any queue content costs bounded memory and time,
    // since a share's users can write there: a line longer than 64 KiB is malformed and logged by
    // its offset and length, never held; a queue file that is sparse or larger than 1 GiB is not
    // read at all (logged, its share marked need-reindex) and counts as pending.
    // Lock: none, except the status lock briefly to mark a share.
    static std::string GetFolderStatus(const std::string& path);
};

}  // namespace FILEINDEX
}  // namespace QIRA
