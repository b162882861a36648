// Which shares, paths and file names may be indexed; room for the index; governing folder.
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "fileindex/utils.h"
#include "log.h"
#include "folder_fields.h"
#include "indexability_rules.h"
#include "path_rules.h"
#include "share_record.h"
#include "qira/qira_fs.h"
#include "qira/qira_quota.h"
#include "qira/qira_share.h"
#include "qira/qlib_core.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const std::vector<std::string> kSystemPreservedNames = {".TemporaryItems", "QIRA@.fileindexdb",
                                                        "QIRA@file_index_queue", ".QIRAPPSDB", ".DS_Store"};

constexpr int kNeverIndexedFsType = 12;
constexpr unsigned long long kIndexSpaceNeeded = 10485760ULL;

bool Contains(const std::string& text, const char* part) { return text.find(part) != std::string::npos; }

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

bool IsListed(const std::vector<std::string>& names, const std::string& name) {
    for (const auto& listed : names) {
        if (listed == name) return true;
    }
    return false;
}


}  // namespace

bool IsSystemPreservedFileName(const std::string& name) {
    return QIRAEAIsHiddenDir(name.c_str()) == 1 || IsListed(kSystemPreservedNames, name);
}

bool IsSkipIndex(const std::string& fullPath) {
    if (!detail::NulFree(fullPath)) return true;
    const int type = QIRAGetFSType(fullPath.c_str(), 0);
    const size_t slash = fullPath.rfind('/');
    if (slash == std::string::npos) return true;
    if (IsSystemPreservedFileName(fullPath.substr(slash + 1))) return true;
    if (InRecycleBin(fullPath) || InSnapshot(fullPath)) return true;
    if (type == -1) return false;
    return IsUnindexableFsType(type);
}

bool CanShareBeIndexed(_tag_QIRASHARE* share) { return detail::EvaluateShare(share, nullptr); }

bool CanPathBeIndexed(const std::string& path) {
    if (!detail::NulFree(path)) return false;
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        FILEIDX_LOG("GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    return CanFullPathBeIndexed(fullPath);
}

bool CanFullPathBeIndexed(const std::string& fullPath) {
    return detail::NulFree(fullPath) && detail::EvaluateFullPath(fullPath, nullptr);
}

bool IsShareSpaceEnough(const std::string& shareName) {
    if (!detail::NulFree(shareName)) return false;
    const detail::ShareRecord share = detail::GetShareRecord(shareName);
    if (!share) {
        FILEIDX_LOG("QIRAShareGet failed, share=%s", shareName.c_str());
        return false;
    }
    if (QIRAQuotaIsEnough(0, share->szPath, kIndexSpaceNeeded) != 0) return true;
    const int err = QLIBCErrGet();
    return err != QLIBC_ERR_NO_SPACE && err != QLIBC_ERR_QUOTA_EXCEEDED;
}

Json::Value GetMostSuitableCfg(std::vector<Folder> folders, const std::string& fullPath) {
    const Folder* chosen = nullptr;
    for (const auto& folder : folders) {
        if (detail::Governs(folder.GetFullPath(), fullPath)) chosen = &folder;
    }
    return chosen ? chosen->asJson() : Json::Value(Json::objectValue);
}

}  // namespace FILEINDEX
}  // namespace QIRA
