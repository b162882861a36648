#include "indexability_rules.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <cstdlib>
#include <memory>

#include "fileindex/utils.h"
#include "log.h"
#include "qira/qira_fs.h"
#include "qira/qira_share.h"
#include "share_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

const std::vector<std::string> kSkippedShareNames = {"surveillance", "NetBackup"};
constexpr int kNeverIndexedFsType = 12;

std::string DescriptionOf(const std::string& rule) {
    for (const auto& [name, description] : IndexabilityRules()) {
        if (name == rule) return description;
    }
    return "";
}

// Records verdicts; tells the evaluation when it must stop (the first refusal without a trace).
class Verdicts {
public:
    explicit Verdicts(std::vector<RuleVerdict>* trace) : trace_(trace) {}
    bool Stop(const char* rule, bool refuses, const Json::Value& facts = Json::Value(Json::objectValue)) {
        if (trace_ != nullptr) trace_->push_back({rule, DescriptionOf(rule), refuses ? "refuse" : "pass", facts});
        if (refuses) allowed_ = false;
        return refuses && trace_ == nullptr;
    }
    void NotEvaluated(const char* rule) {
        if (trace_ != nullptr) trace_->push_back({rule, DescriptionOf(rule), "not_evaluated", Json::Value()});
    }
    bool Tracing() const { return trace_ != nullptr; }
    bool Allowed() const { return allowed_; }

private:
    std::vector<RuleVerdict>* trace_;
    bool allowed_ = true;
};

bool Contains(const std::string& text, const char* part) { return text.find(part) != std::string::npos; }

bool ShareRules(QIRASHARE* share, Verdicts& verdicts) {
    Json::Value facts(Json::objectValue);
    facts["share"] = share->szName;
    if (verdicts.Stop("skipped_share_name", std::find(kSkippedShareNames.begin(), kSkippedShareNames.end(), share->szName) != kSkippedShareNames.end(), facts)) return false;
    int encrypted = 0;
    int readOnly = 0;
    if (QLIBShareIsEncryptedGet(share, &encrypted) < 0) {
        facts["readable"] = false;
        verdicts.Stop("encrypted_share", true, facts);
        verdicts.NotEvaluated("read_only_share");
        return false;
    }
    const bool readOnlyKnown = QLIBShareIsReadOnlyGet(share, &readOnly) >= 0;
    facts["encrypted"] = encrypted != 0;
    if (verdicts.Stop("encrypted_share", encrypted != 0, facts)) return false;
    facts.removeMember("encrypted");
    facts["readable"] = readOnlyKnown;
    if (readOnlyKnown) facts["read_only"] = readOnly != 0;
    return !verdicts.Stop("read_only_share", !readOnlyKnown || readOnly != 0, facts);
}

}  // namespace

bool InRecycleBin(const std::string& fullPath) {
    return Contains(fullPath, "#recycle") && QIRAShareIsShareRecycle(fullPath.c_str()) != 0;
}

bool InSnapshot(const std::string& fullPath) {
    if (!Contains(fullPath, "#snapshot")) return false;
    int inSnapshot = 0;
    return QLIBFhsPathInSnapshot(fullPath.c_str(), &inSnapshot) == 0 && inSnapshot == 1;
}

bool IsUnindexableFsType(int type) {
    return QIRAFSIsRemoteFS(type) != 0 || QIRAFSIsImageFS(type) != 0 || type == kNeverIndexedFsType;
}

const std::vector<std::pair<std::string, std::string>>& IndexabilityRules() {
    static const std::vector<std::pair<std::string, std::string>> rules = {
        {"recycle_bin", "a path in a share's recycle bin"},
        {"snapshot", "a path in a snapshot"},
        {"file_system", "an unknown, remote or image file system, or type 12"},
        {"share_of_path", "a full path in no share"},
        {"share_record", "a share the platform does not know"},
        {"skipped_share_name", "the shares \"surveillance\" and \"NetBackup\""},
        {"encrypted_share", "an encrypted share (or one whose flag cannot be read)"},
        {"read_only_share", "a read-only share (or one whose flag cannot be read)"},
        {"mount_point", "a mount point, unless the share uses encryption"},
        {"canonical_path", "a path that is not its own real path: a symbolic link, \"..\", a doubled or trailing slash"},
    };
    return rules;
}

bool EvaluateShare(_tag_QIRASHARE* share, std::vector<RuleVerdict>* trace) {
    Verdicts verdicts(trace);
    return share != nullptr && ShareRules(share, verdicts) && verdicts.Allowed();
}

bool EvaluateFullPath(const std::string& fullPath, std::vector<RuleVerdict>* trace) {
    Verdicts verdicts(trace);
    Json::Value facts(Json::objectValue);

    facts["marked"] = Contains(fullPath, "#recycle");
    const bool recycle = InRecycleBin(fullPath);
    facts["recycle_bin"] = recycle;
    if (verdicts.Stop("recycle_bin", recycle, facts)) return false;

    facts = Json::Value(Json::objectValue);
    facts["marked"] = Contains(fullPath, "#snapshot");
    const bool snapshot = InSnapshot(fullPath);
    facts["in_snapshot"] = snapshot;
    if (verdicts.Stop("snapshot", snapshot, facts)) return false;

    const int type = QIRAGetFSType(fullPath.c_str(), 0);
    facts = Json::Value(Json::objectValue);
    facts["type"] = type;
    const bool badType = type == -1 || IsUnindexableFsType(type);
    if (verdicts.Tracing()) {
        facts["class"] = type == -1                         ? "unknown"
                         : QIRAFSIsRemoteFS(type) != 0      ? "remote"
                         : QIRAFSIsImageFS(type) != 0       ? "image"
                         : type == kNeverIndexedFsType      ? "never indexed"
                                                            : "local";
    }
    if (verdicts.Stop("file_system", badType, facts)) return false;

    std::string shareName;
    std::string sharePath;
    facts = Json::Value(Json::objectValue);
    const bool inShare = GetShareNamePathByFullPath(shareName, sharePath, fullPath);
    if (!inShare) FILEIDX_LOG("GetShareNamePathByFullPath failed, path=%s", fullPath.c_str());
    facts["share"] = inShare ? Json::Value(shareName) : Json::Value();
    if (verdicts.Stop("share_of_path", !inShare, facts)) return false;

    const ShareRecord share = inShare ? GetShareRecord(shareName) : ShareRecord();
    const bool known = share != nullptr;
    if (inShare && !known) FILEIDX_LOG("QIRAShareGet failed, share=%s", shareName.c_str());
    if (inShare) {
        facts["found"] = known;
        if (verdicts.Stop("share_record", !known, facts)) return false;
    } else {
        verdicts.NotEvaluated("share_record");
    }

    if (share) {
        if (!ShareRules(share.get(), verdicts) && !verdicts.Tracing()) return false;
        facts = Json::Value(Json::objectValue);
        facts["mount_point"] = QIRAFSDirIsMntPoint(fullPath.c_str()) == 1;
        int isEncryption = 0;
        const bool forbidden = facts["mount_point"].asBool() &&
                               QLIBShareIsEncryptionGet(share.get(), &isEncryption) == 0 && isEncryption == 0;
        if (facts["mount_point"].asBool()) facts["share_uses_encryption"] = isEncryption != 0;
        if (forbidden) FILEIDX_LOG("Mount point[%s] is not allowed to be indexed", fullPath.c_str());
        if (verdicts.Stop("mount_point", forbidden, facts)) return false;
    } else {
        for (const char* rule : {"skipped_share_name", "encrypted_share", "read_only_share", "mount_point"}) {
            verdicts.NotEvaluated(rule);
        }
    }

    char resolved[4096];
    const bool real = realpath(fullPath.c_str(), resolved) != nullptr;
    const int reason = errno;
    facts = Json::Value(Json::objectValue);
    facts["real_path"] = real ? Json::Value(resolved) : Json::Value();
    if (!real) facts["error"] = std::strerror(reason);
    if (!real && reason == ENOENT) facts["exists"] = false;
    const bool canonical = real && fullPath == resolved;
    if (!canonical) FILEIDX_LOG("check realpath failed, path=%s", fullPath.c_str());
    verdicts.Stop("canonical_path", !canonical, facts);
    return verdicts.Allowed();
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
