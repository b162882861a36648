// status.conf in memory: pause state, share flag sets and updated markers.
#include "fileindex/status.h"

#include "fileindex/utils.h"
#include "log.h"
#include "root.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const char kResumeTime[] = "resume_time";
const char kNoSpace[] = "no_space";
const char kNeedReindex[] = "need_reindex";

bool IsFlagged(const Json::Value& body, const char* set, const std::string& share) {
    const Json::Value* flags = body.find(set, set + std::char_traits<char>::length(set));
    return flags != nullptr && flags->isObject() && flags->isMember(share);
}

// The flag set must be an object or null (created as null when absent); anything else is left
// alone and the change fails.
Json::Value* FlagSet(Json::Value& body, const char* set) {
    Json::Value& flags = body[set];
    return (flags.isObject() || flags.isNull()) ? &flags : nullptr;
}

}  // namespace

Status::~Status() = default;

bool Status::Load() { return LoadJson(); }

bool Status::Save() { return SaveJson(); }

std::string Status::GetLockPath() const { return detail::RootPath("/tmp/fileidx_cfg_status.lock"); }

std::string Status::GetPath() const { return detail::RootPath("/usr/qira/etc/fileindex/status.conf"); }

bool Status::Pause(long long resumeTime) {
    if (!body.isObject()) return false;
    body[kResumeTime] = static_cast<Json::Int64>(resumeTime);
    return true;
}

bool Status::Resume() { return Pause(-1); }

bool Status::GetPauseInfo(long long& resumeTime) {
    try {
        resumeTime = body.get(kResumeTime, -1).asInt64();
        return true;
    } catch (const std::exception&) {
        FILEIDX_LOG("json exception");
        return false;
    }
}

bool Status::ShareSetNoSpace(const std::string& share, bool noSpace) {
    if (!body.isObject()) return false;
    Json::Value* flags = FlagSet(body, kNoSpace);
    if (flags == nullptr) return false;
    if (!noSpace) {
        if (flags->isObject()) flags->removeMember(share);
        return true;
    }
    if (!IsFlagged(body, kNoSpace, share) && !NotifyNoSpace()) FILEIDX_LOG("NotifyNoSpace failed");
    (*flags)[share] = true;
    return true;
}

bool Status::ShareIsNoSpace(const std::string& share) { return body.isObject() && IsFlagged(body, kNoSpace, share); }

bool Status::ShareSetNeedReindex(const std::string& share, bool needReindex) {
    if (!body.isObject()) return false;
    Json::Value* flags = FlagSet(body, kNeedReindex);
    if (flags == nullptr) return false;
    if (needReindex) {
        (*flags)[share] = true;
    } else if (flags->isObject()) {
        flags->removeMember(share);
    }
    return true;
}

bool Status::ShareIsNeedReindex(const std::string& share) {
    return body.isObject() && IsFlagged(body, kNeedReindex, share);
}

bool Status::SetUpdated(const std::string& name) {
    if (!body.isObject()) return false;
    body[name] = true;
    return true;
}

bool Status::IsUpdated(const std::string& name) {
    if (!body.isObject()) return false;
    const Json::Value* marker = body.find(name.data(), name.data() + name.size());
    return marker != nullptr && marker->isConvertibleTo(Json::booleanValue) && marker->asBool();
}

}  // namespace FILEINDEX
}  // namespace QIRA
