// Pause and resume, share flags and markers: lock, load, change, save, tell the daemon, unlock.
#include "fileindex/status_mgr.h"

#include <cstdint>
#include <ctime>
#include <functional>

#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "daemon_channel.h"
#include "log.h"
#include "unlock_on_exit.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

using Change = std::function<bool(Status&)>;

bool Read(const std::string& name, const std::function<bool(Status&)>& question) {
    Status status;
    return detail::NulFree(name) && status.Load() && question(status);
}

// The daemon command (when `type` is not empty) is sent while the status lock is held.
bool Write(const Change& change, const std::string& type = std::string(), const Json::Value& data = Json::Value()) {
    Status status;
    detail::UnlockOnExit unlock(status);
    if (!status.Lock(true) || !status.Load() || !change(status) || !status.Save()) return false;
    if (!type.empty() && !SendCammandToDaemon(type, data)) {
        FILEIDX_LOG("SendCammandToDaemon failed");
        return false;
    }
    return true;
}

// Kept deliberately narrow: the sum wraps past 2,147,483,647 and then reads as not paused.
long long ResumeTimeAfter(int hours) {
    const uint32_t now = static_cast<uint32_t>(time(nullptr));
    return static_cast<int32_t>(now + 3600u * static_cast<uint32_t>(hours));
}

}  // namespace

bool StatusMgr::GetPauseInfo(long long& resumeTime) {
    Status status;
    return status.Load() && status.GetPauseInfo(resumeTime);
}

bool StatusMgr::ShareIsNoSpace(const std::string& share) {
    return Read(share, [&](Status& s) { return s.ShareIsNoSpace(share); });
}

bool StatusMgr::ShareIsNeedReindex(const std::string& share) {
    return Read(share, [&](Status& s) { return s.ShareIsNeedReindex(share); });
}

bool StatusMgr::IsUpdated(const std::string& name) {
    return Read(name, [&](Status& s) { return s.IsUpdated(name); });
}

bool StatusMgr::SetUpdated(const std::string& name) {
    return detail::NulFree(name) && Write([&](Status& s) { return s.SetUpdated(name); });
}

bool StatusMgr::ShareSetNoSpace(const std::string& share, bool noSpace) {
    return detail::NulFree(share) && Write([&](Status& s) { return s.ShareSetNoSpace(share, noSpace); });
}

bool StatusMgr::ShareSetNeedReindex(const std::string& share, bool needReindex) {
    return detail::NulFree(share) && Write([&](Status& s) { return s.ShareSetNeedReindex(share, needReindex); });
}

bool StatusMgr::Pause(const int& hours) {
    if (hours < 0) {
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    const long long resumeTime = hours == 0 ? 0 : ResumeTimeAfter(hours);
    Json::Value data(Json::objectValue);
    data["resume_time"] = static_cast<Json::Int64>(resumeTime);
    return Write([&](Status& s) { return s.Pause(resumeTime); }, "pause", data);
}

bool StatusMgr::Resume() {
    return Write([](Status& s) { return s.Resume(); }, "resume", Json::Value(Json::objectValue));
}

bool StatusMgr::ShareRevive(const std::string& share) {
    return detail::NulFree(share) &&
           Write([&](Status& s) { return s.ShareSetNoSpace(share, false); }, "revive_share_worker", detail::ShareNameData(share));
}

}  // namespace FILEINDEX
}  // namespace QIRA
