// Pause and resume, share flags and status words, each call on a fresh image of status.conf.
#pragma once

#include "fileindex/export.h"

#include <string>

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT StatusMgr {
public:
    StatusMgr() = delete;

    // Readers: no lock; false when status.conf cannot be read.
    static bool GetPauseInfo(long long& resumeTime);
    static bool ShareIsNoSpace(const std::string& share);
    static bool ShareIsNeedReindex(const std::string& share);
    static bool IsUpdated(const std::string& name);

    // Writers: exclusive status lock around load, change, save (and the daemon command).
    static bool SetUpdated(const std::string& name);
    static bool ShareSetNoSpace(const std::string& share, bool noSpace);
    static bool ShareSetNeedReindex(const std::string& share, bool needReindex);
    // hours < 0: error 1, nothing touched; 0: until resumed; the end is computed in 32 bits.
    static bool Pause(const int& hours);
    static bool Resume();
    // Clears the share's out-of-space flag and revives its worker in the daemon.
    static bool ShareRevive(const std::string& share);

    // "finished", "processing" or "paused".
    static bool GetStatus(std::string& status);
    // "finished", "processing", "paused" or "err_no_space"; never fails.
    static std::string GetFolderStatus(const std::string& path);
};

}  // namespace FILEINDEX
}  // namespace QIRA
