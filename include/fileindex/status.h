// status.conf: pause state, per-share out-of-space and need-reindex flags, updated markers.
#pragma once

#include "fileindex/export.h"

#include <string>

#include "fileindex/config.h"

namespace QIRA {
namespace FILEINDEX {

// In-memory image of status.conf. Nothing here locks, loads or saves; no operation throws.
// A flag set ("no_space", "need_reindex") that holds neither an object nor null is not
// repaired: setting or clearing a flag in it fails (returns false) and changes nothing. When the
// whole file is not a JSON object, every setter fails, the flag questions answer false and
// GetPauseInfo fails with "json exception".
class FILEINDEX_EXPORT Status : public Config {
public:
    ~Status() override;

    bool Load() override;
    bool Save() override;
    std::string GetLockPath() const override;
    std::string GetPath() const override;

    // resumeTime: 0 = paused until resumed, otherwise the end in epoch seconds.
    bool Pause(long long resumeTime);
    bool Resume();
    // -1 when absent; false ("json exception" logged) when the member is not a 64-bit integer.
    bool GetPauseInfo(long long& resumeTime);

    // Raises the no-space notice when the share becomes flagged.
    bool ShareSetNoSpace(const std::string& share, bool noSpace);
    bool ShareIsNoSpace(const std::string& share);
    bool ShareSetNeedReindex(const std::string& share, bool needReindex);
    bool ShareIsNeedReindex(const std::string& share);

    bool SetUpdated(const std::string& name);
    // A marker that is not convertible to a boolean (a string, an array, an object) reads false.
    bool IsUpdated(const std::string& name);
};

}  // namespace FILEINDEX
}  // namespace QIRA
